#include "E2eSupport.h"

#include "support/Wait.h"

#include <QCoreApplication>
#include <QDeadlineTimer>
#include <QFile>
#include <QHostAddress>
#include <QRegularExpression>
#include <QTcpServer>
#include <QTcpSocket>

#include <cerrno>
#include <poll.h>
#include <sys/stat.h>
#include <unistd.h>

namespace e2e {

quint16 freeTcpPort()
{
    QTcpServer probe;
    if (!probe.listen(QHostAddress::LocalHost, 0))
        return 0;
    const quint16 port = probe.serverPort();
    probe.close();
    return port;
}

QByteArray allByteValues(int size, int seed)
{
    QByteArray bytes(size, Qt::Uninitialized);
    for (int i = 0; i < size; ++i) {
        const int block = i / 256 + seed;
        // 167 is odd, so each block is a permutation of 0..255.
        bytes[i] = char(((i % 256) * 167 + block * 31) & 0xFF);
    }
    return bytes;
}

QString serverSessionSection(int number, int connector, quint16 port, bool autoActivate)
{
    return QStringLiteral("[Session%1]\r\n"
                          "Connector=%2\r\n"
                          "BaudRate=6\r\n"
                          "TCPOption=1\r\n"
                          "LocalIP=127.0.0.1\r\n"
                          "IPAddress=127.0.0.1\r\n"
                          "PortNumber=%3\r\n"
                          "AutoActivate=%4\r\n"
                          "BufferSerialData=0\r\n"
                          "WaitForCr=0\r\n"
                          "AllowMultiConnect=1\r\n"
                          "ServerSerialOptions=0\r\n")
        .arg(number)
        .arg(connector)
        .arg(port)
        .arg(autoActivate ? 1 : 0);
}

QByteArray fileBytes(const QString &path)
{
    QFile file(path);
    return file.open(QIODevice::ReadOnly) ? file.readAll() : QByteArray();
}

QString iniValue(const QString &text, const QString &section, const QString &key)
{
    static const QRegularExpression lineBreak(QStringLiteral("\r?\n"));
    bool inSection = false;
    const QStringList lines = text.split(lineBreak);
    for (const QString &rawLine : lines) {
        const QString line = rawLine.trimmed();
        if (line.startsWith(u'[') && line.endsWith(u']')) {
            inSection = line.mid(1, line.size() - 2).trimmed().compare(section, Qt::CaseInsensitive) == 0;
            continue;
        }
        if (!inSection || line.startsWith(u';'))
            continue;
        const qsizetype equals = line.indexOf(u'=');
        if (equals > 0 && line.left(equals).trimmed().compare(key, Qt::CaseInsensitive) == 0)
            return line.mid(equals + 1).trimmed();
    }
    return {};
}

QByteArray readFromSocket(QTcpSocket &socket, int count, int timeoutMs)
{
    QByteArray received;
    waitUntil([&] {
        received += socket.readAll();
        return received.size() >= count;
    }, timeoutMs);
    return received;
}

::testing::AssertionResult sameBytes(const QByteArray &actual, const QByteArray &expected)
{
    if (actual == expected)
        return ::testing::AssertionSuccess();
    qsizetype at = 0;
    while (at < actual.size() && at < expected.size() && actual[at] == expected[at])
        ++at;
    return ::testing::AssertionFailure() << "got " << actual.size() << " bytes, expected " << expected.size()
                                         << "; first difference at offset " << at;
}

std::function<bool(const QString &)> serverLogLine(const QString &message, quint16 port)
{
    const QString ending = QStringLiteral("Server Mode, Local Port: %1").arg(port);
    return [message, ending](const QString &line) { return line.contains(message) && line.endsWith(ending); };
}

bool isSymbolicLink(const QString &path)
{
    struct stat info {};
    return ::lstat(QFile::encodeName(path).constData(), &info) == 0 && S_ISLNK(info.st_mode);
}

} // namespace e2e
