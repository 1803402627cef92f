#pragma once

#include "log/FastBuffer.h"

#include <QDir>
#include <QFile>
#include <QTemporaryDir>

#include <gtest/gtest.h>

#include <clocale>
#include <cstdio>

/// A home of its own for each test, so that no test sees the user's folders, nor those of another test.
class TemporaryHome : public testing::Test
{
protected:
    TemporaryHome()
    {
        std::setlocale(LC_ALL, "C.UTF-8");
        qputenv("HOME", m_home.path().toLocal8Bit());
        qputenv("XDG_CONFIG_HOME", m_home.filePath(".config").toLocal8Bit());
    }

    QString home(const char *path = "") const { return m_home.filePath(QString::fromUtf8(path)); }
    /// The folder for log files when nothing else is said.
    QString standardFolder() const { return home("Documents/KyVisaTester"); }

    static QStringList filesIn(const QString &folder)
    {
        return QDir(folder).entryList(QDir::AllEntries | QDir::NoDotAndDotDot | QDir::System, QDir::Name);
    }

    static std::string contentOf(const QString &path)
    {
        QFile file(path);
        return file.open(QIODevice::ReadOnly) ? file.readAll().toStdString() : "(not readable)";
    }

    static void writeFile(const QString &path, const char *content)
    {
        QFile file(path);
        ASSERT_TRUE(file.open(QIODevice::WriteOnly));
        file.write(content);
    }

    static FastBuffer line(std::uint64_t number, const char *text, std::int32_t status = 0, std::uint64_t duration = 0)
    {
        FastBuffer result{};
        std::snprintf(result.text, sizeof result.text, "%s", text);
        result.line = number;
        result.status = status;
        result.duration = duration;
        return result;
    }

private:
    QTemporaryDir m_home;
};
