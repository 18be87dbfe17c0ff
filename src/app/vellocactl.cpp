// Command-line client of Velloca's command channel.
#include <QCoreApplication>
#include <QTextStream>

namespace {
constexpr int kExitUnreachable = 2;

void printUsage(QTextStream &out)
{
    out << "usage: vellocactl [--socket PATH] TOPIC COMMAND\n"
           "  TOPIC    System, a connector such as COM3, or Session<n>\n"
           "  COMMAND  [ACTIVATE], [DEACTIVATE], [COMSETTINGS=9600,N,8,1] or [APPEXIT]\n"
           "exit status: 0 accepted, 1 refused, 2 unreachable\n";
}
}

int main(int argc, char **argv)
{
    QCoreApplication app(argc, argv);
    QTextStream err(stderr);
    printUsage(err);
    err << "vellocactl: the command channel is not available in this version\n";
    return kExitUnreachable;
}
