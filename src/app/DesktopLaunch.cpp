#include "DesktopLaunch.h"

#include <QByteArray>
#include <QFile>

#include <cerrno>
#include <climits>
#include <cstring>
#include <unistd.h>

void execDesktopProgram(char **argv, QString *error)
{
    char self[PATH_MAX];
    const ssize_t length = ::readlink("/proc/self/exe", self, sizeof self - 1);
    if (length <= 0) {
        *error = QStringLiteral("cannot find the program's own folder: %1").arg(QString::fromLocal8Bit(std::strerror(errno)));
        return;
    }
    QByteArray path(self, length);
    path = path.left(path.lastIndexOf('/') + 1) + "velloca-desktop";
    argv[0] = path.data();
    ::execv(path.constData(), argv);
    *error = QStringLiteral("cannot start %1: %2").arg(QFile::decodeName(path), QString::fromLocal8Bit(std::strerror(errno)));
}
