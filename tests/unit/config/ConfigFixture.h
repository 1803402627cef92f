#pragma once

#include "config/kyconfigfile.h"
#include "support/QuietFork.h"

#include <QFile>
#include <QTemporaryDir>

#include <gtest/gtest.h>

#include <sys/wait.h>
#include <unistd.h>

#include <map>
#include <string>
#include <vector>

/// A configuration file written by hand, and what stands in it afterwards, read line by line rather than by the code under
/// test.
class ConfigFile : public testing::Test
{
protected:
    using Section = std::map<std::string, std::string>;

    QString path() const { return m_folder.filePath("kyvisa.ini"); }
    QString folder() const { return m_folder.path(); }

    void write(const std::string &content) const
    {
        QFile file(path());
        ASSERT_TRUE(file.open(QIODevice::WriteOnly | QIODevice::Truncate));
        file.write(content.data(), static_cast<qint64>(content.size()));
    }

    std::string content() const
    {
        QFile file(path());
        return file.open(QIODevice::ReadOnly) ? file.readAll().toStdString() : "(no file)";
    }

    /// Keys and values of one section, the values without the double quotes around them.
    Section section(const std::string &name) const
    {
        Section entries;
        bool inside = false;
        for (const QByteArray &raw : QByteArray::fromStdString(content()).split('\n')) {
            const QByteArray line = raw.trimmed();
            if (line.startsWith('[')) {
                inside = line == QByteArray::fromStdString("[" + name + "]");
            } else if (inside && line.contains('=')) {
                QByteArray value = line.mid(line.indexOf('=') + 1).trimmed();
                if (value.size() > 1 && value.startsWith('"') && value.endsWith('"'))
                    value = value.mid(1, value.size() - 2);
                entries[line.left(line.indexOf('=')).trimmed().toStdString()] = value.toStdString();
            }
        }
        return entries;
    }

    static std::vector<std::string> seconds(const QList<KyConfigFile::Resource> &records)
    {
        std::vector<std::string> texts;
        for (const auto &record : records)
            texts.push_back(record.second.toStdString());
        return texts;
    }

    /// Runs @p action in a child process whose user owns nothing, and gives its answer; -1 when it did not end by itself.
    template <typename Action>
    static int asNobody(Action action)
    {
        const pid_t child = test::forkWhileOthersWait();
        if (child == 0) {
            if (geteuid() == 0 && (setgid(65534) != 0 || setuid(65534) != 0))
                _exit(100);
            _exit(action());
        }
        int status = 0;
        return child > 0 && waitpid(child, &status, 0) == child && WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    }

private:
    QTemporaryDir m_folder;
};
