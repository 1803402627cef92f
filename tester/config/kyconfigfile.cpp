#include "config/kyconfigfile.h"

#include "config/ConfigEncoding.h"

#include <QFile>
#include <QSettings>
#include <QStringList>

#include <algorithm>
#include <array>
#include <limits>

namespace
{
using Resource = KyConfigFile::Resource;
using ResourceType = KyConfigFile::ResourceType;

const std::array<QString, 5> SectionNames{
    QStringLiteral("KYVXI11-RSRCS"), QStringLiteral("SOCKET-RSRCS"), QStringLiteral("HISLIP-RSRCS"),
    QStringLiteral("KYIB-RSRCS"),    QStringLiteral("KYGPIB-RSRCS"),
};
const QString LibrarySection = QStringLiteral("KYVISA");
const QString DebugKey = QStringLiteral("Debug");
const QString ResourcePrefix = QStringLiteral("Name");
const QString ResourceCount = QStringLiteral("NumOfResources");
const QString AliasSection = QStringLiteral("ALIASES");
const QString AliasPrefix = QStringLiteral("Alias");
const QString AliasCount = QStringLiteral("NumAliases");
const QString AliasSeparator = QStringLiteral("','");

// The sections that take part in load() and save(); KYIB-RSRCS and KYGPIB-RSRCS are left to those who edit the text.
constexpr std::array SavedTypes{ResourceType::Vxi11, ResourceType::Socket, ResourceType::Hislip};

/// QSettings takes a value with a bare comma for a list.
QString textOf(const QVariant &value)
{
    return value.type() == QVariant::StringList ? value.toStringList().join(QLatin1Char(',')) : value.toString();
}

QString resourceText(const Resource &resource)
{
    return resource.second;
}

/// Fills both names from the text of an alias entry.
void splitAlias(Resource &alias)
{
    const QStringList pieces = alias.text.split(AliasSeparator);
    alias.first = pieces.value(0).remove(QLatin1Char('\''));
    alias.second = pieces.value(1).remove(QLatin1Char('\''));
}

QString aliasText(const Resource &alias)
{
    // An entry that could not be split properly and that nobody changed stays as somebody wrote it.
    Resource loaded = alias;
    splitAlias(loaded);
    if (!alias.section.isEmpty() && loaded.first == alias.first && loaded.second == alias.second)
        return alias.text;
    return QLatin1Char('\'') + alias.first + AliasSeparator + alias.second + QLatin1Char('\'');
}

/// The number behind the prefix of a key; entries without one come last.
qulonglong numberOf(const Resource &record, const QString &prefix)
{
    bool ok = false;
    const qulonglong number = record.key.startsWith(prefix) ? record.key.mid(prefix.size()).toULongLong(&ok) : 0;
    return ok ? number : std::numeric_limits<qulonglong>::max();
}
} // namespace

KyConfigFile::KyConfigFile(const QString &path) : m_path(path) {}

KyConfigFile::~KyConfigFile() = default;

QString KyConfigFile::typeToString(ResourceType type)
{
    const auto index = static_cast<std::size_t>(type);
    return index < SectionNames.size() ? SectionNames[index] : QString();
}

bool KyConfigFile::load()
{
    QFile file(m_path);
    const QByteArray bytes = file.open(QIODevice::ReadOnly) ? file.readAll() : QByteArray();
    file.close();

    m_settings.reset(); // the old one writes what it still holds before the new one reads
    m_settings = std::make_unique<QSettings>(m_path, QSettings::IniFormat);
    m_settings->setIniCodec(configEncoding(bytes));
    m_settings->setAtomicSyncRequired(false); // a file may be writable in a folder that is not

    m_resources.clear();
    m_aliases.clear();
    loadDebug();
    for (const ResourceType type : SavedTypes)
        load(type);
    loadAlias();
    return true;
}

bool KyConfigFile::save()
{
    if (!m_settings || m_path.isEmpty() || !m_settings->isWritable())
        return false;
    keepCommas();
    saveDebug();
    for (const ResourceType type : SavedTypes)
        save(type);
    saveAlias();
    m_settings->sync();
    return m_settings->status() != QSettings::AccessError;
}

void KyConfigFile::loadDebug()
{
    if (m_settings)
        m_debug = m_settings->value(LibrarySection + QLatin1Char('/') + DebugKey, false).toBool();
}

void KyConfigFile::saveDebug()
{
    if (m_settings)
        m_settings->setValue(LibrarySection + QLatin1Char('/') + DebugKey, m_debug);
}

void KyConfigFile::load(ResourceType type)
{
    for (Resource &record : readSection(typeToString(type))) {
        record.first = record.key;
        record.second = record.text;
        m_resources.append(record);
    }
}

void KyConfigFile::save(ResourceType type)
{
    writeSection(typeToString(type), ResourcePrefix, ResourceCount, m_resources, resourceText);
}

void KyConfigFile::loadAlias()
{
    for (Resource &record : readSection(AliasSection)) {
        splitAlias(record);
        m_aliases.append(record);
    }
}

void KyConfigFile::saveAlias()
{
    writeSection(AliasSection, AliasPrefix, AliasCount, m_aliases, aliasText);
}

QList<Resource> KyConfigFile::readSection(const QString &section)
{
    QList<Resource> records;
    if (!m_settings || section.isEmpty())
        return records;
    m_settings->beginGroup(section);
    const QStringList keys = m_settings->allKeys();
    for (const QString &key : keys) {
        Resource record;
        record.section = section;
        record.key = key;
        record.text = textOf(m_settings->value(key));
        records.append(record);
    }
    m_settings->endGroup();
    return records;
}

void KyConfigFile::writeSection(const QString &section, const QString &prefix, const QString &countKey,
                                QList<Resource> records, QString (*textOfRecord)(const Resource &))
{
    if (!m_settings || section.isEmpty())
        return;
    const auto leftOut = [&](const Resource &record) {
        return !record.section.isEmpty() && (record.section != section || record.key == countKey);
    };
    records.erase(std::remove_if(records.begin(), records.end(), leftOut), records.end());
    // QSettings lists Name10 before Name2.
    std::stable_sort(records.begin(), records.end(), [&](const Resource &left, const Resource &right) {
        return numberOf(left, prefix) < numberOf(right, prefix);
    });

    m_settings->beginGroup(section);
    const QStringList keys = m_settings->allKeys();
    for (const QString &key : keys)
        m_settings->remove(key);
    for (int i = 0; i < records.size(); ++i)
        m_settings->setValue(prefix + QString::number(i), textOfRecord(records[i]));
    m_settings->setValue(countKey, records.size());
    m_settings->endGroup();
}

void KyConfigFile::keepCommas()
{
    // Written back as a list, "hislip0,4880" of a section that is none of ours would get a blank behind its comma.
    const QStringList keys = m_settings->allKeys();
    for (const QString &key : keys) {
        const QVariant value = m_settings->value(key);
        if (value.type() == QVariant::StringList)
            m_settings->setValue(key, textOf(value));
    }
}
