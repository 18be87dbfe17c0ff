#include "platform/AutostartEntry.h"

#include <QDir>
#include <QFile>
#include <QProcess>
#include <QTemporaryDir>

#include <gtest/gtest.h>

#include <optional>

namespace {

QString readFile(const QString &path)
{
    QFile file(path);
    return file.open(QIODevice::ReadOnly) ? QString::fromUtf8(file.readAll()) : QString();
}

bool writeFile(const QString &path, const QByteArray &data, QFile::Permissions permissions = {})
{
    QFile file(path);
    if (!file.open(QIODevice::WriteOnly) || file.write(data) != data.size())
        return false;
    return permissions == QFile::Permissions() || file.setPermissions(permissions);
}

// The value of key in the [Desktop Entry] group, with the string escapes
// (\s \n \t \r \\) undone.
std::optional<QString> desktopEntryValue(const QString &text, const QString &key)
{
    bool inGroup = false;
    for (const QString &line : text.split(u'\n')) {
        if (line.startsWith(u'['))
            inGroup = line == QLatin1String("[Desktop Entry]");
        else if (inGroup && line.startsWith(key + u'=')) {
            const QString raw = line.mid(key.size() + 1);
            QString value;
            for (qsizetype i = 0; i < raw.size(); ++i) {
                if (raw[i] != u'\\' || i + 1 == raw.size()) {
                    value += raw[i];
                    continue;
                }
                const QChar escaped = raw[++i];
                value += escaped == u's' ? QChar(u' ') : escaped == u'n' ? QChar(u'\n')
                    : escaped == u't' ? QChar(u'\t') : escaped == u'r' ? QChar(u'\r') : escaped;
            }
            return value;
        }
    }
    return std::nullopt;
}

// Splits an Exec value into the program's arguments as a launcher does:
// blanks separate, double quotes group, and inside quotes a backslash takes
// the next '"', '`', '$' or '\' literally; then %% becomes %. Empty on a
// malformed value (open quote, stray field code).
QStringList execArguments(const QString &exec)
{
    QStringList arguments;
    QString current;
    bool inArgument = false;
    bool inQuotes = false;
    for (qsizetype i = 0; i < exec.size(); ++i) {
        const QChar c = exec[i];
        if (inQuotes) {
            if (c == u'\\' && i + 1 < exec.size() && QStringLiteral("\"`$\\").contains(exec[i + 1]))
                current += exec[++i];
            else if (c == u'"')
                inQuotes = false;
            else
                current += c;
        } else if (c == u' ') {
            if (inArgument)
                arguments << current;
            current.clear();
            inArgument = false;
        } else {
            inArgument = true;
            if (c == u'"')
                inQuotes = true;
            else
                current += c;
        }
    }
    if (inQuotes)
        return {};
    if (inArgument)
        arguments << current;
    for (QString &argument : arguments) {
        QString expanded;
        for (qsizetype i = 0; i < argument.size(); ++i) {
            if (argument[i] != u'%') {
                expanded += argument[i];
            } else if (i + 1 < argument.size() && argument[i + 1] == u'%') {
                expanded += u'%';
                ++i;
            } else {
                return {};
            }
        }
        argument = expanded;
    }
    return arguments;
}

class AutostartEntryTest : public ::testing::Test
{
protected:
    void SetUp() override
    {
        ASSERT_TRUE(m_dir.isValid());
        m_savedConfigHome = qgetenv("XDG_CONFIG_HOME");
        m_hadConfigHome = qEnvironmentVariableIsSet("XDG_CONFIG_HOME");
        setConfigHome(m_dir.filePath(QStringLiteral("config")));
    }
    void TearDown() override
    {
        if (m_hadConfigHome)
            qputenv("XDG_CONFIG_HOME", m_savedConfigHome);
        else
            qunsetenv("XDG_CONFIG_HOME");
    }
    void setConfigHome(const QString &folder) { qputenv("XDG_CONFIG_HOME", QFile::encodeName(folder)); }
    QString entryPath() const { return m_dir.filePath(QStringLiteral("config/autostart/velloca.desktop")); }

    QTemporaryDir m_dir;
    QByteArray m_savedConfigHome;
    bool m_hadConfigHome = false;
};

} // namespace

TEST_F(AutostartEntryTest, EntryStartsAProgramWhosePathHasBlanksAndShellCharacters)
{
    const QString folder = m_dir.filePath(QStringLiteral("My Programs 100% $HOME `id` \"q\" back\\slash"));
    ASSERT_TRUE(QDir().mkpath(folder));
    const QString program = folder + QStringLiteral("/velloca %f");
    const QString marker = m_dir.filePath(QStringLiteral("started"));
    ASSERT_TRUE(writeFile(program, QStringLiteral("#!/bin/sh\necho \"$#\" > '%1'\n").arg(marker).toUtf8(),
                          QFile::ReadOwner | QFile::WriteOwner | QFile::ExeOwner));

    QString error;
    ASSERT_TRUE(SetAutoStart(true, program, &error)) << error.toStdString();
    EXPECT_EQ(autostartEntryPath(), entryPath());
    const QString text = readFile(entryPath());
    EXPECT_TRUE(text.startsWith(QStringLiteral("[Desktop Entry]\n")));
    EXPECT_EQ(desktopEntryValue(text, QStringLiteral("Type")), QStringLiteral("Application"));
    EXPECT_EQ(desktopEntryValue(text, QStringLiteral("Name")), QStringLiteral("Velloca"));

    const std::optional<QString> exec = desktopEntryValue(text, QStringLiteral("Exec"));
    ASSERT_TRUE(exec.has_value());
    EXPECT_TRUE(exec->startsWith(u'"')) << exec->toStdString();
    const QStringList arguments = execArguments(*exec);
    ASSERT_EQ(arguments, QStringList { program }) << exec->toStdString();

    // Started the way a launcher would: the program runs, with no arguments.
    QProcess launched;
    launched.start(arguments.first(), arguments.mid(1));
    ASSERT_TRUE(launched.waitForFinished(30000)) << launched.errorString().toStdString();
    EXPECT_EQ(readFile(marker), QStringLiteral("0\n"));
}

TEST_F(AutostartEntryTest, DisablingDeletesTheEntryAndEnablingReplacesIt)
{
    QString error;
    EXPECT_TRUE(SetAutoStart(false, QStringLiteral("/usr/bin/velloca"), &error)); // none there yet
    EXPECT_TRUE(error.isEmpty());

    ASSERT_TRUE(SetAutoStart(true, QStringLiteral("/usr/bin/velloca")));
    ASSERT_TRUE(SetAutoStart(true, QStringLiteral("/opt/velloca/velloca")));
    EXPECT_EQ(desktopEntryValue(readFile(entryPath()), QStringLiteral("Exec")),
              QStringLiteral("\"/opt/velloca/velloca\""));
    EXPECT_EQ(QDir(m_dir.filePath(QStringLiteral("config/autostart"))).entryList(QDir::Files | QDir::Hidden),
              QStringList { "velloca.desktop" }); // no temporary file left

    EXPECT_TRUE(SetAutoStart(false, QString()));
    EXPECT_FALSE(QFile::exists(entryPath()));
    EXPECT_TRUE(SetAutoStart(false, QString()));
}

TEST_F(AutostartEntryTest, FailuresNameThePathAndTheReason)
{
    // The autostart folder would lie under a regular file: not writable, even by root.
    const QString plainFile = m_dir.filePath(QStringLiteral("plain-file"));
    ASSERT_TRUE(writeFile(plainFile, "x"));
    setConfigHome(plainFile);
    QString error;
    EXPECT_FALSE(SetAutoStart(true, QStringLiteral("/usr/bin/velloca"), &error));
    EXPECT_TRUE(error.contains(plainFile + QStringLiteral("/autostart"))) << error.toStdString();
    EXPECT_TRUE(error.contains(QStringLiteral("Not a directory"))) << error.toStdString();
    // There can be no entry to delete there.
    EXPECT_TRUE(SetAutoStart(false, QString()));

    // An entry that is a folder cannot be replaced or removed.
    setConfigHome(m_dir.filePath(QStringLiteral("config")));
    ASSERT_TRUE(QDir().mkpath(entryPath()));
    error.clear();
    EXPECT_FALSE(SetAutoStart(true, QStringLiteral("/usr/bin/velloca"), &error));
    EXPECT_TRUE(error.contains(entryPath())) << error.toStdString();
    error.clear();
    EXPECT_FALSE(SetAutoStart(false, QString(), &error));
    EXPECT_TRUE(error.contains(entryPath())) << error.toStdString();
    ASSERT_TRUE(QDir().rmdir(entryPath()));

    // Program paths no launcher could start are refused, and nothing is written.
    for (const QString &program : { QString(), QStringLiteral("velloca"), QStringLiteral("/opt/a\nb/velloca") }) {
        error.clear();
        EXPECT_FALSE(SetAutoStart(true, program, &error)) << program.toStdString();
        EXPECT_FALSE(error.isEmpty());
    }
    EXPECT_FALSE(QFile::exists(entryPath()));
}
