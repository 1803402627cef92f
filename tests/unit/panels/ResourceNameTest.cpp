#include "panels/ResourceName.h"
#include "panels/ObserverLineEdit.h"

#include <QSignalSpy>

#include <gtest/gtest.h>

namespace
{
/// Asks for the name while it is being told of the change, as the line edit does.
struct AskingObserver final : Observer {
    void update(Subject *subject) override { names << static_cast<ResourceName *>(subject)->getName(); }
    QStringList names;
};

TEST(Subject, UpdatesANewObserverAtOnce)
{
    ResourceName name(2);
    name.setName("GPIB0::5::INSTR");
    AskingObserver observer;
    name.addObserver(&observer);
    EXPECT_EQ(observer.names, QStringList({"GPIB0::5::INSTR"}));
}

TEST(Subject, RemovesOneRegistrationAtATime)
{
    ResourceName name(2);
    AskingObserver observer;
    name.addObserver(&observer);
    name.addObserver(&observer);
    name.setName("a");
    EXPECT_EQ(observer.names, QStringList({"", "", "a", "a"}));
    name.removeObserver(&observer);
    name.setName("b");
    name.removeObserver(&observer);
    name.setName("c");
    name.removeObserver(&observer);
    EXPECT_EQ(observer.names, QStringList({"", "", "a", "a", "b"}));
}

/// Writes its own name down.
struct NamedObserver final : Observer {
    NamedObserver(const char *itsName, QStringList *itsTold) : name(itsName), told(itsTold) {}
    void update(Subject *) override { *told << name; }
    QString name;
    QStringList *told;
};

TEST(Subject, TellsObserversInTheirOrderAndRemovesTheFirstOccurrence)
{
    QStringList told;
    NamedObserver a("a", &told), b("b", &told), c("c", &told);
    ResourceName name(2);
    for (NamedObserver *observer : {&a, &b, &a, &c})
        name.addObserver(observer);
    told.clear();
    name.setName("x");
    EXPECT_EQ(told, QStringList({"a", "b", "a", "c"}));
    told.clear();
    name.removeObserver(&a);
    name.setName("y");
    EXPECT_EQ(told, QStringList({"b", "a", "c"}));
}

TEST(ResourceName, AnObserverMayAskForTheNameWhileItIsNotified)
{
    ResourceName name(2);
    AskingObserver observer;
    name.addObserver(&observer);
    name.setName("one");
    name.setData("two");
    EXPECT_EQ(observer.names, QStringList({"", "one", "two"}));
}

TEST(ResourceName, LosesLineBreaksInTheStoredValueOnceItIsAsked)
{
    ResourceName name(2);
    name.setName("TCPIP::\nhost\n::INSTR\n");
    EXPECT_EQ(name.getData(), QByteArray("TCPIP::\nhost\n::INSTR\n"));
    EXPECT_EQ(name.getName(), "TCPIP::host::INSTR");
    EXPECT_EQ(name.getData(), QByteArray("TCPIP::host::INSTR"));
}

TEST(ResourceName, IsSavedAsUtf8AndReadAsLatin1)
{
    ResourceName name(2);
    name.setName(QString(QChar(0xFC)));
    EXPECT_EQ(name.getData(), QByteArray("\xC3\xBC"));
    name.setData("\xC3\xBC");
    EXPECT_EQ(name.getName(), QString(QChar(0xC3)) + QChar(0xBC));
}

TEST(ResourceName, IsReadUpToTheFirstZeroByte)
{
    ResourceName name(2);
    name.setData(QByteArray("ab\0cd", 5));
    EXPECT_EQ(name.getName(), "ab");
    name.setData(QByteArray("\0cd", 3));
    EXPECT_EQ(name.getName(), "");
    name.setName("x");
    name.setData(QByteArray());
    EXPECT_EQ(name.getName(), "");
}

TEST(ResourceName, IsComparedByItsIdentifier)
{
    ResourceName two(2);
    ResourceName alsoTwo(2);
    ResourceName three(3);
    alsoTwo.setName("other");
    EXPECT_TRUE(two == alsoTwo);
    EXPECT_FALSE(two == three);
    EXPECT_TRUE(two < three);
    EXPECT_FALSE(two < alsoTwo);
}

TEST(ResourceLine, ShowsTheNameAndAnnouncesItAlsoWhenItIsTheSame)
{
    ResourceName name(2);
    name.setName("USB::1");
    ObserverLineEdit line(nullptr);
    QSignalSpy changed(&line, &QLineEdit::textChanged);
    name.addObserver(&line);
    EXPECT_EQ(line.text(), "USB::1");
    EXPECT_EQ(changed.count(), 2); // once by the new text, once on purpose
    name.setName("USB::1");
    EXPECT_EQ(changed.count(), 3);
    EXPECT_EQ(changed.last().first().toString(), "USB::1");
}

TEST(ResourceLine, SendsUtf8AndAcceptsAnEmptyLine)
{
    ObserverLineEdit line(nullptr);
    Parameter slot{7, "before"};
    EXPECT_TRUE(line.getParameter(slot));
    EXPECT_EQ(slot.stringValue, "");
    EXPECT_EQ(slot.uintValue, 7u);
    line.setText(QString::fromUtf8("M\xC3\xBCller"));
    EXPECT_TRUE(line.getParameter(slot));
    EXPECT_EQ(slot.stringValue, "M\xC3\xBCller");
}
} // namespace
