#include "DialogTestSupport.h"
#include "MessageRecorder.h"

#include "dialogs/AboutDialog.h"
#include "dialogs/SystemInfoTool.h"
#include "localisation/ResourceStrings.h"
#include "localisation/UiLanguageScope.h"
#include "support/Wait.h"

#include <QDesktopServices>
#include <QFile>
#include <QGuiApplication>
#include <QLabel>
#include <QPushButton>
#include <QTemporaryDir>
#include <QTest>
#include <QUrl>

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

// Catches what the About box asks the desktop to open.
class UrlCatcher : public QObject
{
    Q_OBJECT
public:
    UrlCatcher() { QDesktopServices::setUrlHandler(u"https"_s, this, "open"); }
    ~UrlCatcher() override { QDesktopServices::unsetUrlHandler(u"https"_s); }

    QList<QUrl> opened;

public Q_SLOTS:
    void open(const QUrl &url) { opened << url; }
};

bool writeTool(const QString &path, const QByteArray &script)
{
    QFile file(path);
    return file.open(QIODevice::WriteOnly) && file.write(script) == script.size()
           && file.setPermissions(QFile::ReadOwner | QFile::WriteOwner | QFile::ExeOwner);
}

QString labelText(const QWidget &dialog, const char *name)
{
    return control<QLabel>(dialog, QString::fromLatin1(name))->text();
}

TEST(AboutDialogTest, ShowsTheVersionLineAndOurOwnTextsLocalisedWhereTheyHaveIds)
{
    {
        UiLanguageScope english(UiLanguage::English);
        AboutDialog dialog;
        EXPECT_EQ(dialog.objectName(), u"frmAbout"_s);
        EXPECT_TRUE(dialog.isModal());
        EXPECT_EQ(dialog.windowTitle(), u"About Velloca"_s);
        EXPECT_EQ(labelText(dialog, "lblTitle"), u"RS232 to TCP/IP Converter"_s);
        EXPECT_EQ(labelText(dialog, "lblVersion"), u"Velloca  Version 1.0.0"_s);
        EXPECT_EQ(control<QPushButton>(dialog, u"cmdOK"_s)->text(), u"&OK"_s);
        EXPECT_EQ(control<QPushButton>(dialog, u"cmdSysInfo"_s)->text(), u"&System Info..."_s);
        EXPECT_TRUE(control<QPushButton>(dialog, u"cmdOK"_s)->isDefault());

        const QString ownTexts = labelText(dialog, "lblDescription") + labelText(dialog, "lblDisclaimer");
        EXPECT_TRUE(labelText(dialog, "lblDescription").contains(u"Velloca"_s));
        EXPECT_FALSE(labelText(dialog, "lblDisclaimer").isEmpty());
        EXPECT_FALSE(ownTexts.contains(u"Orvane"_s, Qt::CaseInsensitive));
        EXPECT_TRUE(QUrl(labelText(dialog, "Label4"), QUrl::StrictMode).isValid());
    }
    {
        UiLanguageScope japanese(UiLanguage::Japanese);
        AboutDialog dialog;
        EXPECT_EQ(dialog.windowTitle(), LoadResString(5057));
        EXPECT_EQ(labelText(dialog, "lblTitle"), LoadResString(5058));
        EXPECT_NE(LoadResString(5058), u"RS232 to TCP/IP Converter"_s);
        // The version line replaces caption 5059 in every language.
        EXPECT_EQ(labelText(dialog, "lblVersion"), u"Velloca  Version 1.0.0"_s);
        EXPECT_EQ(dialog.font().family(), LoadResString(20));
    }
}

TEST(AboutDialogTest, OkAndEscCloseAndTheWebLabelOpensItsAddress)
{
    for (const char *leave : { "cmdOK", "Esc" }) {
        SCOPED_TRACE(leave);
        AboutDialog dialog;
        dialog.show();
        if (QByteArray(leave) == "Esc")
            QTest::keyClick(&dialog, Qt::Key_Escape);
        else
            clickControl(dialog, leave);
        EXPECT_FALSE(dialog.isVisible());
    }

    UrlCatcher catcher;
    AboutDialog dialog;
    dialog.show();
    auto *label = control<QLabel>(dialog, u"Label4"_s);
    QTest::mouseClick(label, Qt::LeftButton, {}, QPoint(4, label->height() / 2));
    ASSERT_EQ(catcher.opened.size(), 1);
    EXPECT_EQ(catcher.opened[0], QUrl(label->text()));
    EXPECT_EQ(QGuiApplication::overrideCursor(), nullptr) << "the wait cursor is restored";
    EXPECT_TRUE(dialog.isVisible());
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

#include "AboutDialogTest.moc"
