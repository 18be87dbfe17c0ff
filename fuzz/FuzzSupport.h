#pragma once

#include <QByteArray>
#include <QCoreApplication>
#include <QString>
#include <QtGlobal>

#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>

// Shared by the fuzz targets and their replay programs.
namespace fuzz {

// Timers, sockets and queued signals need an application object; libFuzzer
// gives no hook that the replay main would share, so the first input makes
// it. Qt's warnings about refused input are expected and only slow a run.
inline void ensureApplication()
{
    if (QCoreApplication::instance())
        return;
    qInstallMessageHandler([](QtMsgType type, const QMessageLogContext &, const QString &text) {
        if (type == QtFatalMsg) {
            std::fprintf(stderr, "Qt fatal: %s\n", qPrintable(text));
            std::abort();
        }
    });
    static int argc = 1;
    static char name[] = "velloca-fuzz";
    static char *argv[] = { name, nullptr };
    new QCoreApplication(argc, argv);
}

inline QByteArray bytes(const uint8_t *data, size_t size)
{
    return QByteArray(reinterpret_cast<const char *>(data), qsizetype(size));
}

// A broken property is a finding like a crash: stop with a message the run
// log keeps next to the input that caused it.
inline void require(bool holds, const char *what)
{
    if (!holds) {
        std::fprintf(stderr, "fuzz property failed: %s\n", what);
        std::abort();
    }
}

} // namespace fuzz
