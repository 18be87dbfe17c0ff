#include "DisplayPlatform.h"

#include "platform/VirtualPortFolder.h"
#include "session/SessionEngine.h"
#include "session/SessionWindow.h"

#include <QApplication>

int main(int argc, char **argv)
{
    chooseOffscreenPlatformWhenHeadless();
    QApplication app(argc, argv);
    QApplication::setApplicationName(QStringLiteral("Velloca"));
    QApplication::setApplicationVersion(QStringLiteral(VELLOCA_VERSION));

    SessionEngine engine(SessionPlatform::real(defaultVirtualPortFolder()));
    SessionWindow window(&engine);
    window.show();
    return app.exec();
}
