// GoogleTest entry point for the views' tests: a Qt widget application on
// the offscreen platform. Every test case runs in its own process (CTest), so the
// environment set here is the test's own.
#include <QApplication>
#include <gmock/gmock.h>

int main(int argc, char **argv)
{
    if (qEnvironmentVariableIsEmpty("QT_QPA_PLATFORM"))
        qputenv("QT_QPA_PLATFORM", "offscreen");
    QApplication app(argc, argv);
    // The programs under test are built next to the test programs.
    if (qEnvironmentVariableIsEmpty("VELLOCA_BUILD_DIR"))
        qputenv("VELLOCA_BUILD_DIR", QCoreApplication::applicationDirPath().toLocal8Bit());
    ::testing::InitGoogleMock(&argc, argv);
    return RUN_ALL_TESTS();
}
