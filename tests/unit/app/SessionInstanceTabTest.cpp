#include "app/SessionInstanceTab.h"
#include "log/LogFile.h"
#include "panels/ObserverLineEdit.h"
#include "panels/ScipiLineEdit.h"
#include "pipeline/VisaDispatcher.h"
#include "support/EventLoop.h"
#include "support/standin/Standin.h"

#include <visa.h>

#include <QBoxLayout>
#include <QCheckBox>
#include <QDir>
#include <QElapsedTimer>
#include <QFile>
#include <QFileInfo>
#include <QKeyEvent>
#include <QLineEdit>
#include <QPlainTextEdit>
#include <QPushButton>
#include <QSignalSpy>
#include <QTableWidget>
#include <QTest>

#include <gtest/gtest.h>

#include <memory>

namespace
{
class SessionTab : public testing::Test
{
protected:
    SessionTab()
    {
        standin::reset();
        QDir().mkpath(QFileInfo(m_dataFile).path());
        QFile::remove(m_dataFile);
        build();
    }

    void build() { m_tab = std::make_unique<SessionInstanceTab>(m_dispatcher, nullptr).release(); }

    ~SessionTab() override
    {
        end();
        QFile::remove(m_dataFile);
    }

    void end()
    {
        delete m_tab;
        m_tab = nullptr;
    }

    template <class Widget>
    Widget *find(const char *name) const
    {
        auto *widget = m_tab->findChild<Widget *>(QString::fromLatin1(name));
        EXPECT_NE(widget, nullptr) << name;
        return widget;
    }

    void press(const char *name) const { QTest::mouseClick(find<QPushButton>(name), Qt::LeftButton); }

    void connectTo(const char *resource) const
    {
        find<QLineEdit>("resourceName")->setText(resource);
        press("resourceConnect");
        ASSERT_TRUE(processEventsUntil([this] { return !find<QPushButton>("resourceDisconnect")->isHidden(); }));
    }

    QByteArray data() const
    {
        QFile file(m_dataFile);
        EXPECT_TRUE(file.open(QIODevice::ReadOnly));
        return file.readAll();
    }

    const QString m_dataFile = QString::fromLocal8Bit(qgetenv("XDG_DATA_HOME")) + "/Oltrava/KyVisaTester/data.adr";

    QObject m_parent;
    VisaDispatcher *m_dispatcher = VisaDispatcher::getVisaDispatcherInstance(&m_parent);
    SessionInstanceTab *m_tab = nullptr;
};

TEST_F(SessionTab, LaysOutFrameLogAndPages)
{
    auto *pages = find<QTabWidget>("sessionPages");
    struct Page {
        const char *label;
        const char *name;
    };
    int at = 0;
    for (const Page &page :
         {Page{"Basics", "basicTab"}, Page{"Locking", "lockTab"}, Page{"Attributes", "attributesTab"},
          Page{"Events", "eventTab"}, Page{"Gpib", "gpibTab"}}) {
        ASSERT_GT(pages->count(), at);
        EXPECT_EQ(pages->tabText(at), page.label);
        EXPECT_EQ(pages->widget(at)->objectName(), page.name);
        EXPECT_TRUE(pages->widget(at)->autoFillBackground()) << page.name;
        ++at;
    }
    auto *frame = find<QFrame>("resourceFrame");
    EXPECT_EQ(frame->frameShape(), QFrame::Panel);
    EXPECT_EQ(frame->frameShadow(), QFrame::Raised);

    auto *column = qobject_cast<QVBoxLayout *>(m_tab->layout());
    ASSERT_TRUE(column);
    EXPECT_EQ(column->itemAt(0)->widget(), frame);
    EXPECT_EQ(column->stretch(0), 1);
    EXPECT_EQ(column->stretch(1), 20);
    auto *row = qobject_cast<QHBoxLayout *>(column->itemAt(1)->layout());
    ASSERT_TRUE(row);
    EXPECT_EQ(row->itemAt(0)->widget(), find<QTableWidget>("logTable")->parentWidget());
    EXPECT_EQ(row->stretch(0), 9);
    EXPECT_EQ(row->itemAt(1)->widget(), pages);
    EXPECT_EQ(row->stretch(1), 1);
    EXPECT_EQ(row->itemAt(1)->alignment(), Qt::AlignRight);
}

TEST_F(SessionTab, EachChangeOfTheResourceNameReachesTheLineEditTwice)
{
    QSignalSpy changed(find<QLineEdit>("resourceName"), &QLineEdit::textChanged);
    m_tab->getResourceName()->setName("USB0::1::2::3::INSTR");
    // The first update changes the text and announces it once more, the second announces it only.
    EXPECT_EQ(changed.count(), 3);
    for (const QList<QVariant> &emission : changed)
        EXPECT_EQ(emission.first().toString(), "USB0::1::2::3::INSTR");
}

TEST_F(SessionTab, RunsAQueryFromPressToView)
{
    standin::setReply("*IDN?", "Acme,1,2,3\n");
    connectTo("TCPIP::localhost::hislip0");
    find<ScipiLineEdit>("basicCommand")->setEditText(R"(*IDN?\n)");
    press("basicQuery");
    auto *view = find<QPlainTextEdit>("basicReadView");
    EXPECT_TRUE(processEventsUntil([view] { return view->toPlainText() == "Acme,1,2,3\n"; }));
    auto *table = find<QTableWidget>("logTable");
    m_tab->resize(900, 600);
    m_tab->show();
    EXPECT_TRUE(processEventsUntil([table] { return table->rowCount() > 0; }));
}

TEST_F(SessionTab, ANewSessionGetsTheStateOfSendEnd)
{
    find<QCheckBox>("basicSendEnd")->setChecked(false);
    ASSERT_TRUE(processEventsUntil([] { return standin::calls("viSetAttribute").size() == 1; }));
    connectTo("GPIB0::5::INSTR");
    ASSERT_TRUE(processEventsUntil([] { return standin::calls("viSetAttribute").size() == 2; }));
    EXPECT_EQ(standin::calls("viSetAttribute").at(1).numbers, (std::vector<std::uint64_t>{0x3FFF0016, 0}));
}

TEST_F(SessionTab, ShowLogSwitchesTheLiveLog)
{
    m_tab->resize(900, 600);
    m_tab->show();
    auto *table = find<QTableWidget>("logTable");
    find<QCheckBox>("showLog")->setChecked(false);
    QCoreApplication::processEvents(); // the switch is queued
    connectTo("GPIB0::5::INSTR");
    ASSERT_TRUE(processEventsUntil([] { return standin::calls("viSetAttribute").size() == 1; }));
    find<QCheckBox>("showLog")->setChecked(true);
    QCoreApplication::processEvents();
    press("basicReadStb");
    ASSERT_TRUE(processEventsUntil([table] { return table->rowCount() > 0; }));
    EXPECT_EQ(table->rowCount(), 1) << "what was called while the box was off is not shown";
    ASSERT_NE(table->item(0, 3), nullptr);
    EXPECT_TRUE(table->item(0, 3)->text().startsWith("viReadSTB(")) << table->item(0, 3)->text().toStdString();
}

TEST_F(SessionTab, WriteLogSwitchesTheLogFile)
{
    connectTo("GPIB0::5::INSTR");
    ASSERT_TRUE(processEventsUntil([] { return standin::calls("viSetAttribute").size() == 1; }));
    find<QCheckBox>("writeLog")->setChecked(true);
    QCoreApplication::processEvents();
    press("basicTrigger");
    const QString path = m_tab->getLogFile()->getCurrentFileName();
    ASSERT_FALSE(path.isEmpty());
    const auto written = [&path] {
        QFile file(path);
        return file.open(QIODevice::ReadOnly) ? file.readAll() : QByteArray();
    };
    EXPECT_TRUE(processEventsUntil([&written] { return written().endsWith("nsec\n"); }));
    EXPECT_TRUE(written().contains("viAssertTrigger("));
    EXPECT_FALSE(written().contains("viOpen("));
}

TEST_F(SessionTab, LogSwitchesTakeEffectThroughTheEventLoop)
{
    m_tab->resize(900, 600);
    m_tab->show();
    connectTo("GPIB0::5::INSTR");
    ASSERT_TRUE(processEventsUntil([] { return standin::calls("viSetAttribute").size() == 1; }));
    find<QCheckBox>("showLog")->setChecked(false);
    _visaFunctionCall call;
    call.type = VisaFunctionCallTyp::ReadSTB;
    for (int i = 0; i < 2; ++i) // the second call begins after the first one's line was emitted
        ASSERT_TRUE(m_tab->getVisaFunctionCallHandler()->sendVisaFunctionCall(call, false));
    ASSERT_TRUE(standin::waitForCalls("viReadSTB", 2));
    auto *table = find<QTableWidget>("logTable");
    EXPECT_TRUE(processEventsUntil([table] { return !table->findItems("viReadSTB(", Qt::MatchStartsWith).isEmpty(); }));
}

TEST_F(SessionTab, ItsItemsHaveTheIdentifiersTwoAndThree)
{
    EXPECT_TRUE(*m_tab->getResourceName() == ResourceName(2));
    EXPECT_TRUE(static_cast<Data &>(*m_tab->getLogFile()) == ResourceName(3));
}

TEST_F(SessionTab, AFirstRunWritesTheThreeItems)
{
    const QByteArray folder = m_tab->getLogFile()->getCurrentStandardDir().toLocal8Bit();
    end();
    const QByteArray history(":syst:err?\\n\n*IDN?\\n");
    const QByteArray length = QByteArray::number(folder.size()).rightJustified(6, '0');
    const QByteArray expected = "000001000000" + length + folder + "000020" + history;
    EXPECT_EQ(data(), expected);
    EXPECT_EQ(data().size(), 6 + 3 * 6 + folder.size() + history.size());
}

TEST_F(SessionTab, RestoresNameFolderAndHistoryOfThePreviousRun)
{
    const QString folder = QDir::tempPath() + QString("/kyvisa-app-%1").arg(QCoreApplication::applicationPid());
    QDir().mkpath(folder);
    m_tab->getResourceName()->setName("VXI0::3::INSTR");
    m_tab->getLogFile()->setCurrentStandardDir(folder);
    find<ScipiLineEdit>("basicCommand")->setData("one\ntwo");
    end();
    build();
    EXPECT_EQ(find<QLineEdit>("resourceName")->text(), "VXI0::3::INSTR");
    EXPECT_EQ(m_tab->getResourceName()->getName(), "VXI0::3::INSTR");
    EXPECT_EQ(m_tab->getLogFile()->getCurrentStandardDir(), folder);
    auto *command = find<ScipiLineEdit>("basicCommand");
    ASSERT_EQ(command->count(), 2);
    EXPECT_EQ(command->itemText(0), "one");
    EXPECT_EQ(command->itemText(1), "two");
    EXPECT_EQ(command->currentText(), "");
    end();
    QDir(folder).removeRecursively();
}

TEST_F(SessionTab, StartsOnADamagedStore)
{
    for (const QByteArray &bytes :
         {QByteArray(), QByteArray("00"), QByteArray("000001999999x"), QByteArray(3000, '\xFF'),
          QByteArray("000001-00009abcdef"), QByteArray(100000, '\0')}) {
        end();
        QFile file(m_dataFile);
        ASSERT_TRUE(file.open(QIODevice::WriteOnly));
        file.write(bytes);
        file.close();
        build();
    }
    connectTo("GPIB0::5::INSTR");
}

TEST_F(SessionTab, PassesKeysToTheBasicPageOnlyWhileThatIsShown)
{
    m_tab->show();
    QTest::keyClick(m_tab, Qt::Key_R, Qt::ControlModifier);
    ASSERT_TRUE(processEventsUntil([] { return standin::calls("viRead").size() == 1; }));
    QCoreApplication::processEvents();

    auto *pages = find<QTabWidget>("sessionPages");
    pages->setCurrentIndex(1);
    QKeyEvent dropped(QEvent::KeyPress, Qt::Key_R, Qt::ControlModifier);
    QCoreApplication::sendEvent(m_tab, &dropped);
    EXPECT_TRUE(dropped.isAccepted()) << "not even passed on to the window";
    pages->setCurrentIndex(0);
    QTest::keyClick(m_tab, Qt::Key_W, Qt::ControlModifier);
    ASSERT_TRUE(processEventsUntil([] { return standin::calls("viWrite").size() == 1; }));
    EXPECT_EQ(standin::calls("viRead").size(),
              1u); // the worker executes in order: no second read came before the write
}

TEST_F(SessionTab, OpensAndClosesTheResourceManager)
{
    m_tab->closeRM();
    m_tab->openRM();
    connectTo("GPIB0::5::INSTR");
}

TEST_F(SessionTab, EndsTheProcessWithStatus55WhenTheWorkerIsStuckAfterSavingTheStore)
{
    end();
    QFile::remove(m_dataFile);
    testing::FLAGS_gtest_death_test_style = "threadsafe";
    QElapsedTimer timer;
    timer.start();
    EXPECT_EXIT(
        {
            QObject parent;
            auto *tab = new SessionInstanceTab(VisaDispatcher::getVisaDispatcherInstance(&parent), nullptr);
            const auto gate = std::make_shared<standin::Gate>();
            standin::script("viOpen", {.gate = gate});
            tab->findChild<QLineEdit *>("resourceName")->setText("ASRL1::INSTR");
            QTest::mouseClick(tab->findChild<QPushButton *>("resourceConnect"), Qt::LeftButton);
            if (gate->waitForArrival())
                delete tab;
        },
        testing::ExitedWithCode(55), "");
    EXPECT_GE(timer.elapsed(), 4000) << "the worker was given its time";
    EXPECT_EQ(data().left(24), "000001000012ASRL1::INSTR");
}
} // namespace
