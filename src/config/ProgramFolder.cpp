#include "ProgramFolder.h"

#include <QDir>
#include <QStandardPaths>

namespace {

QString &folderOverride()
{
    static QString folder;
    return folder;
}

} // namespace

QString programFolder()
{
    QString folder = folderOverride();
    if (folder.isEmpty()) {
        // Follows $XDG_CONFIG_HOME, falling back to ~/.config when unset.
        folder = QStandardPaths::writableLocation(QStandardPaths::GenericConfigLocation)
            + QStringLiteral("/velloca");
    }
    QDir().mkpath(folder);
    return folder;
}

QString programFolderFile(const QString &fileName)
{
    QString folder = programFolder();
    if (!folder.endsWith(QLatin1Char('/')))
        folder += QLatin1Char('/');
    return folder + fileName;
}

void setProgramFolderForTesting(const QString &folder)
{
    folderOverride() = folder;
}
