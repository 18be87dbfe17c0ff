#include "ManualLocation.h"

#include <QCoreApplication>
#include <QDir>
#include <QFileInfo>

// The packaging build passes both; the defaults match its install layout.
#ifndef VELLOCA_MANUAL_RELATIVE_PATH
#define VELLOCA_MANUAL_RELATIVE_PATH "../share/doc/velloca/manual.html"
#endif
#ifndef VELLOCA_SOURCE_DIR
#define VELLOCA_SOURCE_DIR ""
#endif

namespace {

QString existingFile(const QString &path)
{
    const QFileInfo info(path);
    return info.isFile() ? QDir::cleanPath(info.absoluteFilePath()) : QString();
}

} // namespace

QString manualPath(const QString &applicationDir, const QString &sourceDir)
{
    // The installed copy wins: a program built from a source tree and then
    // installed shows the manual that was installed with it.
    if (!applicationDir.isEmpty()) {
        const QString installed = existingFile(
            QDir(applicationDir).filePath(QStringLiteral(VELLOCA_MANUAL_RELATIVE_PATH)));
        if (!installed.isEmpty())
            return installed;
    }
    if (!sourceDir.isEmpty())
        return existingFile(QDir(sourceDir).filePath(QStringLiteral("docs/manual.html")));
    return {};
}

QString manualPath()
{
    return manualPath(QCoreApplication::applicationDirPath(), QStringLiteral(VELLOCA_SOURCE_DIR));
}
