#pragma once

#include <QList>
#include <QString>

#include <memory>

class QSettings;

/**
 * The INI configuration file of the VISA library: debug switch, resources that are found without a search in the network,
 * aliases of resource strings.
 *
 *     KyConfigFile file(path);
 *     file.load();
 *     QList<KyConfigFile::Resource> aliases = file.listOfAlias();
 *     aliases.append({"dmm", "TCPIP::192.168.1.9::INSTR"});
 *     file.setListOfAlias(aliases);
 *     if (!file.save())
 *         ... the file cannot be written
 *
 * The three resource sections share one list. A loaded record remembers the section and the key that it came from and goes
 * back there; a record made by hand, as above, goes into every section that is saved. The keys "NumOfResources" and
 * "NumAliases" are loaded as records like all others, but not written back: saving counts anew.
 *
 * Values of other sections survive. Comments do not; the editor of the file's text keeps them.
 */
class KyConfigFile
{
public:
    /// An entry of a section. @c first is the key of a resource or the name of an alias, @c second the resource string.
    struct Resource {
        QString first;
        QString second;
        QString section = {}; ///< where a loaded record came from, empty in one made by hand
        QString key = {};
        QString text = {}; ///< the value as loaded
    };

    enum class ResourceType { Vxi11 = 0, Socket = 1, Hislip = 2, Kyib = 3, Gpib = 4 };

    explicit KyConfigFile(const QString &path);
    ~KyConfigFile();
    KyConfigFile(const KyConfigFile &) = delete;
    KyConfigFile &operator=(const KyConfigFile &) = delete;

    /// Counts from the next load() on; until then save() writes to the file that was loaded.
    void setFilePath(const QString &path) { m_path = path; }

    bool debugEnable() const { return m_debug; }
    void setDebugEnable(const bool &enable) { m_debug = enable; }

    /// Name of the section; empty for a value that is no type.
    static QString typeToString(ResourceType type);

    QList<Resource> listOfResources() const { return m_resources; }
    void setListOfResource(const QList<Resource> &resources) { m_resources = resources; }
    QList<Resource> listOfAlias() const { return m_aliases; }
    void setListOfAlias(const QList<Resource> &aliases) { m_aliases = aliases; }

    /// Reads the file afresh. A missing file has empty lists and no debug output. Always true.
    bool load();
    /// False, and nothing is changed, before the first load() and when the file cannot be written.
    bool save();

    // The steps of the two above. Without a preceding load() they do nothing.
    void load(ResourceType type); ///< appends to the list
    void save(ResourceType type);
    void loadDebug();
    void saveDebug();
    void loadAlias(); ///< appends to the list
    void saveAlias();

private:
    QList<Resource> readSection(const QString &section);
    void writeSection(const QString &section, const QString &prefix, const QString &countKey, QList<Resource> records,
                      QString (*textOf)(const Resource &));
    void keepCommas();

    QString m_path;
    bool m_debug = false;
    std::unique_ptr<QSettings> m_settings;
    QList<Resource> m_resources;
    QList<Resource> m_aliases;
};
