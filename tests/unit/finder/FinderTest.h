#pragma once

#include "finder/ResourceDialog.h"
#include "unit/panels/PanelTest.h"

#include <QCheckBox>
#include <QGuiApplication>
#include <QLabel>
#include <QLineEdit>
#include <QPushButton>
#include <QSettings>
#include <QSpinBox>
#include <QTreeWidget>

#include <string>

/// The finder in front of a handler, with the test in the worker's place.
class Finder : public PanelTest
{
protected:
    Finder() { QSettings().clear(); }

    ~Finder() override
    {
        m_dialog.reset();
        EXPECT_EQ(QGuiApplication::overrideCursor(), nullptr) << "the cursor stayed behind";
    }

    /// Opens a dialog and takes the three requests that it begins with.
    void open()
    {
        m_dialog = std::make_unique<ResourceDialog>(m_handler.get(), nullptr);
        m_dialog->show();
        ASSERT_TRUE(QTest::qWaitForWindowExposed(m_dialog.get()));
        requests();
    }

    template <class Widget>
    Widget *child(const char *name)
    {
        return find<Widget>(*m_dialog, name);
    }
    QTreeWidget *tree() { return child<QTreeWidget>("finderResults"); }
    bool findEnabled() { return child<QPushButton>("finderFind")->isEnabled(); }
    static bool waiting()
    {
        return QGuiApplication::overrideCursor() && QGuiApplication::overrideCursor()->shape() == Qt::WaitCursor;
    }

    static _visaFunctionCall found(Kind kind, const std::string &resource, std::uint64_t toCome,
                                   const std::string &identification = {}, const std::string &description = {},
                                   const std::string &hostName = {})
    {
        _visaFunctionCall call = result(kind);
        call.parameter[0].stringValue = resource;
        call.parameter[1].uintValue = toCome;
        call.parameter[1].stringValue = identification;
        call.parameter[2].uintValue = 1;
        call.parameter[2].stringValue = description + '\0' + hostName;
        return call;
    }

    /// A search that finds these resources, from the press of the button to the last answer.
    void search(const std::vector<std::string> &resources)
    {
        press(child<QPushButton>("finderFind"));
        for (std::size_t i = 0; i < resources.size(); ++i) {
            ASSERT_EQ(requests().size(), 1U);
            finish(found(i == 0 ? Kind::FindRsrc : Kind::FindNext, resources[i], resources.size() - 1 - i));
        }
        EXPECT_TRUE(requests().empty());
    }

    static std::vector<std::string> lastSearch()
    {
        std::vector<std::string> resources;
        for (const SearchResult &result : ResourceDialog::getLastSearch())
            resources.push_back(result.resource.toStdString());
        return resources;
    }

    void clickRow(const QTreeWidgetItem *item, Qt::MouseButton button = Qt::LeftButton)
    {
        QTest::mouseClick(tree()->viewport(), button, {}, tree()->visualItemRect(item).center());
    }
    void doubleClickRow(const QTreeWidgetItem *item)
    {
        clickRow(item); // as a person's double click does
        QTest::mouseDClick(tree()->viewport(), Qt::LeftButton, {}, tree()->visualItemRect(item).center());
    }

    std::unique_ptr<ResourceDialog> m_dialog;
};
