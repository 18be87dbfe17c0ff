#pragma once

#include <QDateTime>
#include <QString>

struct GlobalOptions;

// What a log line tells about the session that wrote it: its local address,
// its role, and the endpoint of its first socket member.
struct ErrorLogContext
{
    QString LocalIPAddress;
    qint32 TCPOption = 0; // 0 client, otherwise server
    QString RemoteHost;
    int RemotePort = 0;
    int LocalPort = 0;
};

// One line of errorlog.txt without its line end, with date and time of now
// in local time. Line breaks inside the message become blanks so that every
// event stays on one line.
QString errorLogLine(const ErrorLogContext &context, const QString &message,
                     const QDateTime &now);

// Records one event: appends its line to errorlog.txt in the program folder
// when options.LogErrors is set, and, independently, starts
// options.OnErrorRunApp when one is configured (a few copies at a time, see
// ErrorProgram.h; the line says how many starts were skipped before it).
// Never fails towards the caller: a log that cannot be written and a program
// that cannot be started are passed over.
void writeErrorLogLine(const ErrorLogContext &context, const QString &message,
                       const GlobalOptions &options,
                       const QDateTime &now = QDateTime::currentDateTime());
