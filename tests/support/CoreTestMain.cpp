// GoogleTest entry point for the core's tests: a Qt core application, so
// tests can run the event loop (sockets, notifiers, timers), and no widget
// or platform plugin at all. Every test case runs in its own process
// (CTest), so the environment set here is the test's own.
#include <QCoreApplication>
#include <gmock/gmock.h>

int main(int argc, char **argv)
{
    QCoreApplication app(argc, argv);
    // The programs under test are built next to the test programs.
    if (qEnvironmentVariableIsEmpty("VELLOCA_BUILD_DIR"))
        qputenv("VELLOCA_BUILD_DIR", QCoreApplication::applicationDirPath().toLocal8Bit());
    ::testing::InitGoogleMock(&argc, argv);
    return RUN_ALL_TESTS();
}
