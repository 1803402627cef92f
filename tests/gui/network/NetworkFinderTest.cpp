// The finder in front of the library that ships, in networks of its own: network-finder.py builds them and starts this program in
// one that is empty, then in one with these instruments.
//
//     10.1.0.2, 10.2.0.2   everything, with a web page
//     10.1.0.3             HiSLIP, announced by multicast DNS alone
//     10.2.0.3             VXI-11, to be asked for at its portmapper alone

#include "gui/support/FinderDialog.h"

#include "app/MainWindow.h"

#include <gmock/gmock.h>

#include <QDesktopServices>
#include <QMenu>
#include <QUrl>
#include <QWindow>

#include <algorithm>
#include <cstdlib>
#include <iterator>
#include <string>

using testing::ElementsAre;
using testing::IsEmpty;

namespace
{

using Texts = std::vector<std::string>;

const Texts FirstInstrument = {"TCPIP0::10.1.0.2", "TCPIP0::10.1.0.2::hislip0::INSTR", "TCPIP0::10.1.0.2::inst0::INSTR",
                               "TCPIP0::10.1.0.2::5025::SOCKET"};
const Texts SecondInstrument = {"TCPIP0::10.2.0.2", "TCPIP0::10.2.0.2::hislip0::INSTR",
                                "TCPIP0::10.2.0.2::inst0::INSTR", "TCPIP0::10.2.0.2::5025::SOCKET"};
const Texts AnnouncedOnly = {"TCPIP0::10.1.0.3", "TCPIP0::10.1.0.3::hislip0::INSTR"};
const Texts AtThePortmapperOnly = {"TCPIP0::10.2.0.3", "TCPIP0::10.2.0.3::inst0::INSTR"};

class NetworkFinder : public FinderDialog<WindowTest>
{
protected:
    NetworkFinder() { openWindow(); }

    void SetUp() override
    {
        const char *inside = std::getenv("NETLAB_INSIDE");
        ASSERT_TRUE(inside && std::string(inside) == "1") << "the network of this machine is not to be searched";
    }

    /// Opens the finder and, when it shows what the library has, sets the methods and the time, searches and takes these steps.
    void searchBy(bool mdns, bool vxi11, int milliseconds, const std::vector<Step> &then)
    {
        std::vector<Step> steps = {[this] { return shown("finderTimeOut", "value").toInt() > 1; }, now([=, this] {
                                       if (shown("finderMdns", "checked").toBool() != mdns)
                                           tick("finderMdns");
                                       if (shown("finderVxi11", "checked").toBool() != vxi11)
                                           tick("finderVxi11");
                                       enterNumber("finderTimeOut", milliseconds);
                                       enter("finderExpression", "TCPIP?*");
                                       press("finderFind");
                                       EXPECT_TRUE(waiting());
                                       EXPECT_FALSE(isEnabled("finderFind"));
                                   })};
        std::copy(then.begin(), then.end(), std::back_inserter(steps));
        inFinder(steps);
    }
    Step ended()
    {
        return [this] { return isEnabled("finderFind"); };
    }

    /// Each device and its resources, as the tree shows them.
    std::vector<Texts> found()
    {
        std::vector<Texts> devices;
        for (int i = 0; i < tree()->topLevelItemCount(); ++i) {
            const QTreeWidgetItem *device = tree()->topLevelItem(i);
            Texts texts = {device->text(0).toStdString()};
            for (int j = 0; j < device->childCount(); ++j)
                texts.push_back(device->child(j)->text(0).toStdString());
            devices.push_back(texts);
        }
        return devices;
    }
    Texts lxiTexts(int device, int resource)
    {
        const QTreeWidgetItem *item = tree()->topLevelItem(device)->child(resource);
        return {item->text(1).toStdString(), item->text(2).toStdString()};
    }

    /// A search whose result @p look judges.
    void find(bool mdns, bool vxi11, const std::function<void()> &look, int milliseconds = 3000)
    {
        searchBy(mdns, vxi11, milliseconds,
                 {ended(), now([&] {
                      EXPECT_FALSE(waiting());
                      look();
                  }),
                  cancel()});
    }
};

using EmptyNetwork = NetworkFinder;
using TwoNetworks = NetworkFinder;

TEST_F(EmptyNetwork, EndsTheSearchInItsTimeByEitherMethod)
{
    for (const auto &[mdns, vxi11] : {std::pair{true, false}, {false, true}, {true, true}, {false, false}}) {
        find(
            mdns, vxi11,
            [this] {
                EXPECT_THAT(found(), IsEmpty());
                EXPECT_TRUE(eventually([this] { return text("statusLabel") == "Status: VI_ERROR_RSRC_NFOUND"; }));
            },
            500);
    }
}

TEST_F(EmptyNetwork, TheFinderLivesWhileNobodyAnswersAndRemembersTheMethods)
{
    searchBy(false, true, 1500,
             {now([this] {
                  enter("finderExpression", "typed meanwhile");
                  EXPECT_EQ(text("finderExpression"), "typed meanwhile");
                  EXPECT_TRUE(waiting());
              }),
              ended(), cancel()});
    inFinder({[this] { return shown("finderTimeOut", "value").toInt() == 1500; }, now([this] {
                  EXPECT_FALSE(shown("finderMdns", "checked").toBool());
                  EXPECT_TRUE(shown("finderVxi11", "checked").toBool());
              }),
              cancel()});
}

TEST_F(EmptyNetwork, AFinderThatIsClosedInTheMiddleLeavesNothingBehind)
{
    searchBy(true, true, 2000, {cancel()});
    EXPECT_EQ(QGuiApplication::overrideCursor(), nullptr);
    enter("resourceName", "typed while the search goes on");
    EXPECT_EQ(text("resourceName"), "typed while the search goes on");
    EXPECT_TRUE(eventually([this] { return text("statusLabel") == "Status: VI_ERROR_RSRC_NFOUND"; }));
    find(
        true, false, [this] { EXPECT_THAT(found(), IsEmpty()); }, 500);
}

TEST_F(TwoNetworks, AreSearchedByMdnsAlone)
{
    find(true, false, [this] {
        ASSERT_THAT(found(), ElementsAre(FirstInstrument, AnnouncedOnly, SecondInstrument));
        EXPECT_THAT(lxiTexts(0, 0), ElementsAre("KyVisaSimulator on 10.1.0.2", "Oltrava,KyVisaSimulator,100001,5.8.6"));
        EXPECT_THAT(lxiTexts(2, 2), ElementsAre("KyVisaSimulator on 10.2.0.2", "Oltrava,KyVisaSimulator,100001,5.8.6"));
        EXPECT_THAT(lxiTexts(1, 0), ElementsAre("", "Oltrava,KyVisaSimulator,100001,5.8.6"))
            << "without a web page it is described by what it announces";
    });
}

TEST_F(TwoNetworks, AreSearchedByVxi11Alone)
{
    find(false, true, [this] {
        ASSERT_THAT(found(), ElementsAre(FirstInstrument, SecondInstrument, AtThePortmapperOnly));
        for (const int device : {0, 1})
            EXPECT_EQ(lxiTexts(device, 1)[1], "Oltrava,KyVisaSimulator,100001,5.8.6");
        EXPECT_EQ(lxiTexts(1, 1)[0], "KyVisaSimulator on 10.2.0.2");
        EXPECT_THAT(lxiTexts(2, 0), ElementsAre("", ""));
    });
}

TEST_F(TwoNetworks, AreSearchedByBothMethods)
{
    find(true, true, [this] {
        EXPECT_THAT(found(), ElementsAre(FirstInstrument, AnnouncedOnly, SecondInstrument, AtThePortmapperOnly));
    });
}

TEST_F(TwoNetworks, AreLeftAloneWithBothMethodsOff)
{
    find(false, false, [this] { EXPECT_THAT(found(), IsEmpty()); });
}

TEST_F(TwoNetworks, AFoundInstrumentIsPickedConnectedAndAsked)
{
    searchBy(true, false, 3000, {ended(), now([this] {
                                     ASSERT_THAT(found(),
                                                 ElementsAre(FirstInstrument, AnnouncedOnly, SecondInstrument));
                                     clickResource(2, 0);
                                     EXPECT_EQ(text("finderSelected"), "TCPIP0::10.2.0.2::hislip0::INSTR");
                                     press("finderSelect");
                                 })});
    EXPECT_EQ(text("resourceName"), "TCPIP0::10.2.0.2::hislip0::INSTR");
    press("resourceConnect");
    ASSERT_TRUE(eventually([this] { return isVisible("resourceDisconnect"); })) << text("statusLabel").toStdString();
    enter("basicCommand", "*IDN?\\n");
    press("basicQuery");
    EXPECT_TRUE(eventually([this] {
        return shown("basicReadView", "plainText").toString().startsWith("Oltrava,KyVisaSimulator,100001,");
    })) << shown("basicReadView", "plainText").toString().toStdString();
}

/// Which pages the desktop was asked to show.
class Browser : public QObject
{
    Q_OBJECT

public:
    Browser() { QDesktopServices::setUrlHandler("http", this, "open"); }
    ~Browser() override { QDesktopServices::unsetUrlHandler("http"); }

    QList<QUrl> opened;

public slots:
    void open(const QUrl &url) { opened.append(url); }
};

TEST_F(TwoNetworks, TheMenuLeadsToTheInstrumentsOwnPage)
{
    const Browser browser;
    const auto rightClick = [this](int device, int resource) {
        const QRect row = tree()->visualItemRect(tree()->topLevelItem(device)->child(resource));
        QWidget *dialog = tree()->window();
        QTest::mouseClick(dialog->windowHandle(), Qt::RightButton, {}, tree()->viewport()->mapTo(dialog, row.center()));
        return eventually([dialog] { return dialog->findChild<QMenu *>("finderMenu") != nullptr; });
    };
    const auto goToPage = [this] {
        auto *menu = qobject_cast<QMenu *>(widget("finderMenu"));
        QTest::mouseClick(menu, Qt::LeftButton, {}, menu->actionGeometry(menu->actions().first()).center());
    };
    find(false, true, [&] {
        ASSERT_THAT(found(), ElementsAre(FirstInstrument, SecondInstrument, AtThePortmapperOnly));
        ASSERT_TRUE(rightClick(1, 0));
        goToPage();
    });
    ASSERT_EQ(browser.opened.size(), 1);
    EXPECT_EQ(browser.opened[0].toString(), "http://10.2.0.2");
}

} // namespace

#include "NetworkFinderTest.moc"
