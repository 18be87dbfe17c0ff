#include "DialogTestSupport.h"
#include "MessageRecorder.h"

#include "dialogs/AboutDialog.h"
#include "dialogs/SystemInfoTool.h"
#include "localisation/ResourceStrings.h"
#include "support/UiLanguageScope.h"
#include "support/Wait.h"

#include <QFile>
#include <QGuiApplication>
#include <QPushButton>
#include <QTemporaryDir>
#include <QTest>

#include <gtest/gtest.h>

using namespace Qt::StringLiterals;

namespace {

// Sets PATH for one test and puts the old one back.
class PathScope
{
public:
    explicit PathScope(const QString &path) : m_saved(qgetenv("PATH")) { qputenv("PATH", QFile::encodeName(path)); }
    ~PathScope() { qputenv("PATH", m_saved); }
    PathScope(const PathScope &) = delete;
    PathScope &operator=(const PathScope &) = delete;

private:
    QByteArray m_saved;
};

bool writeTool(const QString &path, const QByteArray &script)
{
    QFile file(path);
    return file.open(QIODevice::WriteOnly) && file.write(script) == script.size()
           && file.setPermissions(QFile::ReadOwner | QFile::WriteOwner | QFile::ExeOwner);
}

TEST(AboutDialogTest, SystemInfoStartsTheFirstKnownToolOnPathOrShowsMessage5073)
{
    QTemporaryDir folder;
    ASSERT_TRUE(folder.isValid());
    const QString emptyFolder = folder.filePath(u"empty"_s);
    const QString toolFolder = folder.filePath(u"tools"_s);
    ASSERT_TRUE(QDir().mkpath(emptyFolder) && QDir().mkpath(toolFolder));
    EXPECT_TRUE(knownSystemInfoTools().contains(u"hardinfo"_s));

    MessageRecorder messages;
    AboutDialog dialog;
    dialog.show();
    {
        PathScope path(emptyFolder);
        EXPECT_TRUE(findSystemInfoTool().isEmpty());
        clickControl(dialog, "cmdSysInfo");
        ASSERT_EQ(messages.messages().size(), 1);
        EXPECT_EQ(messages.messages()[0].text, LoadResString(5073));
        EXPECT_EQ(messages.messages()[0].title, u"Velloca"_s);
        EXPECT_TRUE(dialog.isVisible());
    }

    // A tool that is installed but cannot run (its interpreter is missing).
    const QString tool = toolFolder + u'/' + knownSystemInfoTools().constFirst();
    ASSERT_TRUE(writeTool(tool, "#!/nonexistent/interpreter\n"));
    {
        PathScope path(toolFolder + u':' + emptyFolder);
        EXPECT_EQ(findSystemInfoTool(), tool);
        clickControl(dialog, "cmdSysInfo");
        EXPECT_EQ(messages.messages().size(), 2);
    }

    // Ahead of whatever the machine has installed, the fake tool is the one
    // started; it leaves a mark to show it ran.
    const QString mark = folder.filePath(u"started"_s);
    QFile::remove(tool);
    ASSERT_TRUE(writeTool(tool, "#!/bin/sh\necho started > '" + QFile::encodeName(mark) + "'\n"));
    {
        PathScope path(toolFolder + u':' + QString::fromLocal8Bit(qgetenv("PATH")));
        clickControl(dialog, "cmdSysInfo");
        EXPECT_TRUE(waitUntil([&] { return QFile::exists(mark); }));
        EXPECT_EQ(messages.messages().size(), 2);
        EXPECT_TRUE(dialog.isVisible());
    }
}

} // namespace

