#include "config/IniProfile.h"

#include <QDir>
#include <QElapsedTimer>
#include <QFile>
#include <QFileInfo>
#include <QRandomGenerator>
#include <QTemporaryDir>

#include <gtest/gtest.h>

#include <climits>
#include <csignal>
#include <sys/resource.h>
#include <sys/stat.h>

namespace {

void writeFile(const QString &path, const QByteArray &bytes)
{
    QFile file(path);
    ASSERT_TRUE(file.open(QIODevice::WriteOnly | QIODevice::Truncate)) << qPrintable(path);
    ASSERT_EQ(file.write(bytes), bytes.size());
}

QByteArray readFile(const QString &path)
{
    QFile file(path);
    if (!file.open(QIODevice::ReadOnly))
        return QByteArray();
    return file.readAll();
}

mode_t fileMode(const QString &path)
{
    struct stat info {};
    if (::stat(QFile::encodeName(path).constData(), &info) != 0)
        return 0;
    return info.st_mode & 07777;
}

// Everything in the folder, hidden files included, to catch leftovers.
QStringList folderEntries(const QString &folder)
{
    return QDir(folder).entryList(QDir::AllEntries | QDir::Hidden | QDir::System | QDir::NoDotAndDotDot);
}

} // namespace

TEST(IniProfile, NamesMatchCaseInsensitivelyAndBlanksAreIgnored)
{
    const IniProfile profile = IniProfile::fromText(QStringLiteral(
        "[ velloca ]\r\n"
        "  numsessions   =   3  \r\n"
        "Password\t= secret word \r\n"
        "[SESSION1]\n"
        "PortNumber=4001\n"));

    EXPECT_TRUE(profile.hasSection(QStringLiteral("Velloca")));
    EXPECT_TRUE(profile.hasSection(QStringLiteral("session1")));
    EXPECT_FALSE(profile.hasSection(QStringLiteral("Session2")));
    EXPECT_EQ(profile.readInt(QStringLiteral("Velloca"), QStringLiteral("NumSessions"), 0), 3);
    EXPECT_EQ(profile.readString(QStringLiteral("VELLOCA"), QStringLiteral("PASSWORD"), QString()),
              QStringLiteral("secret word"));
    EXPECT_EQ(profile.readString(QStringLiteral("Session1"), QStringLiteral("portnumber"), QString()),
              QStringLiteral("4001"));
    EXPECT_TRUE(profile.hasKey(QStringLiteral("session1"), QStringLiteral(" PortNumber ")));
}

TEST(IniProfile, NumbersReadAsTheirLeadingDecimalNumber)
{
    const IniProfile profile = IniProfile::fromText(QStringLiteral(
        "[S]\n"
        "Plain=150\n"
        "Trailing=200xyz\n"
        "Blanks=  -7 \n"
        "Plus=+5\n"
        "Fraction=7000.5\n"
        "Letters=abc\n"
        "Hex=0x10\n"
        "Empty=\n"
        "Huge=99999999999999999999999\n"
        "HugeNegative=-99999999999\n"
        "Limit=2147483647\n"
        "LowLimit=-2147483648\n"));
    const QString s = QStringLiteral("S");
    auto read = [&](const char *key, int defaultValue = 42) {
        return profile.readInt(s, QLatin1String(key), defaultValue);
    };
    EXPECT_EQ(read("Plain"), 150);
    EXPECT_EQ(read("Trailing"), 200);
    EXPECT_EQ(read("Blanks"), -7);
    EXPECT_EQ(read("Plus"), 5);
    EXPECT_EQ(read("Fraction"), 7000);
    EXPECT_EQ(read("Letters"), 0) << "no leading number reads as 0, not as the default";
    EXPECT_EQ(read("Hex"), 0);
    EXPECT_EQ(read("Empty"), 42);
    EXPECT_EQ(read("Missing"), 42);
    EXPECT_EQ(profile.readInt(QStringLiteral("NoSuchSection"), QStringLiteral("Plain"), -3), -3);
    EXPECT_EQ(read("Huge"), INT_MAX);
    EXPECT_EQ(read("HugeNegative"), INT_MIN);
    EXPECT_EQ(read("Limit"), INT_MAX);
    EXPECT_EQ(read("LowLimit"), INT_MIN);
}

TEST(IniProfile, TextsAreCutTo199Characters)
{
    const QString longText(250, QLatin1Char('d'));
    QString withNul = QStringLiteral("before");
    withNul += QChar(0);
    withNul += QStringLiteral("after");
    IniProfile profile;
    profile.writeString(QStringLiteral("S"), QStringLiteral("Long"), longText);
    profile.writeString(QStringLiteral("S"), QStringLiteral("Nul"), withNul);
    // A surrogate pair straddling the limit must not be split.
    profile.writeString(QStringLiteral("S"), QStringLiteral("Emoji"),
                        QString(198, QLatin1Char('e')) + QStringLiteral("\U0001F600"));
    const IniProfile reloaded = IniProfile::fromText(profile.toText());

    EXPECT_EQ(reloaded.readString(QStringLiteral("S"), QStringLiteral("Long"), QString()),
              longText.left(199));
    EXPECT_EQ(reloaded.readString(QStringLiteral("S"), QStringLiteral("Missing"), longText),
              longText.left(199));
    EXPECT_EQ(reloaded.readString(QStringLiteral("S"), QStringLiteral("Nul"), QString()),
              QStringLiteral("before"));
    EXPECT_EQ(reloaded.readString(QStringLiteral("S"), QStringLiteral("Emoji"), QString()),
              QString(198, QLatin1Char('e')));
}

TEST(IniProfile, SaveKeepsCommentsUnknownSectionsAndOrder)
{
    QTemporaryDir dir;
    ASSERT_TRUE(dir.isValid());
    const QString path = dir.filePath(QStringLiteral("kept.vlk"));
    writeFile(path,
              "; written by hand\n"
              "stray line before any section\n"
              "\n"
              "[Velloca]\n"
              "  numSessions = 1  \n"
              "; the password is below\n"
              "Custom=keep me\n"
              "Custom=second copy\n"
              "no equals sign here\n"
              "\n"
              "; about the next section\n"
              "[Extra]\n"
              "Anything = goes\n"
              "[velloca]\n"
              "NumSessions=99\n");

    IniProfile profile = IniProfile::load(path);
    profile.writeInt(QStringLiteral("VELLOCA"), QStringLiteral("NumSessions"), 2);
    profile.writeString(QStringLiteral("Velloca"), QStringLiteral("custom"), QStringLiteral("changed"));
    profile.writeString(QStringLiteral("Velloca"), QStringLiteral("Password"), QStringLiteral("pw"));
    profile.writeString(QStringLiteral("Session1"), QStringLiteral("Connector"), QStringLiteral("3"));
    profile.writeString(QStringLiteral("Session1"), QStringLiteral("Text"),
                        QStringLiteral("two\r\nlines"));
    QString error;
    ASSERT_TRUE(profile.save(path, &error)) << qPrintable(error);

    // The file's own line ends (LF here) are kept.
    EXPECT_EQ(readFile(path),
              QByteArray("; written by hand\n"
                         "stray line before any section\n"
                         "\n"
                         "[Velloca]\n"
                         "numSessions=2\n"
                         "; the password is below\n"
                         "Custom=changed\n"
                         "Custom=second copy\n"
                         "Password=pw\n"
                         "no equals sign here\n"
                         "\n"
                         "; about the next section\n"
                         "[Extra]\n"
                         "Anything = goes\n"
                         "[velloca]\n"
                         "NumSessions=99\n"
                         "\n"
                         "[Session1]\n"
                         "Connector=3\n"
                         "Text=two lines\n"));

    const IniProfile reloaded = IniProfile::load(path);
    EXPECT_EQ(reloaded.readInt(QStringLiteral("Velloca"), QStringLiteral("NumSessions"), 0), 2)
        << "the first of two equal sections is the one read";
    EXPECT_EQ(reloaded.keys(QStringLiteral("velloca")),
              QStringList({ "numSessions", "Custom", "Password" }));
    EXPECT_EQ(reloaded.keys(QStringLiteral("Nothing")), QStringList());
}

TEST(IniProfile, AcceptsLfAndCrLfAndKeepsByteOrderMark)
{
    const IniProfile lf = IniProfile::fromText(QStringLiteral("[A]\nK=1\n[B]\nK=2"));
    const IniProfile crlf = IniProfile::fromText(QStringLiteral("[A]\r\nK=1\r\n[B]\r\nK=2\r\n"));
    for (const IniProfile *profile : { &lf, &crlf }) {
        EXPECT_EQ(profile->readInt(QStringLiteral("A"), QStringLiteral("K"), 0), 1);
        EXPECT_EQ(profile->readInt(QStringLiteral("B"), QStringLiteral("K"), 0), 2);
    }
    EXPECT_EQ(lf.toText(), QStringLiteral("[A]\nK=1\n[B]\nK=2\n"));
    EXPECT_EQ(crlf.toText(), QStringLiteral("[A]\r\nK=1\r\n[B]\r\nK=2\r\n"));

    const IniProfile bom = IniProfile::fromText(QStringLiteral("\uFEFF[A]\nK=1\n"));
    EXPECT_EQ(bom.readInt(QStringLiteral("A"), QStringLiteral("K"), 0), 1);
    EXPECT_EQ(bom.toText(), QStringLiteral("\uFEFF[A]\nK=1\n"));
}

TEST(IniProfile, MissingOrUnreadableFilesLoadEmpty)
{
    QTemporaryDir dir;
    ASSERT_TRUE(dir.isValid());
    QString error;
    const IniProfile missing = IniProfile::load(dir.filePath(QStringLiteral("none.vlk")), &error);
    EXPECT_TRUE(error.isEmpty()) << "a missing file is the normal first start";
    EXPECT_EQ(missing.toText(), QString());

    const IniProfile folder = IniProfile::load(dir.path(), &error);
    EXPECT_FALSE(folder.hasSection(QStringLiteral("Velloca")));
    EXPECT_TRUE(error.contains(dir.path())) << qPrintable(error);

    const QString fifo = dir.filePath(QStringLiteral("fifo.vlk"));
    ASSERT_EQ(::mkfifo(QFile::encodeName(fifo).constData(), 0600), 0);
    error.clear();
    EXPECT_FALSE(IniProfile::load(fifo, &error).hasSection(QStringLiteral("Velloca")))
        << "a FIFO with no writer must not block the load";
    EXPECT_TRUE(error.contains(fifo)) << qPrintable(error);

    const QString tooManyLines = dir.filePath(QStringLiteral("lines.vlk"));
    writeFile(tooManyLines, "[Velloca]\nNumSessions=1\n" + QByteArray(IniProfile::kMaxLineCount, '\n'));
    error.clear();
    EXPECT_FALSE(IniProfile::load(tooManyLines, &error).hasSection(QStringLiteral("Velloca")));
    EXPECT_TRUE(error.contains(tooManyLines)) << qPrintable(error);
}

TEST(IniProfile, GarbageLoadsInBoundedTime)
{
    QTemporaryDir dir;
    ASSERT_TRUE(dir.isValid());

    QByteArray garbage(512 * 1024, Qt::Uninitialized);
    QRandomGenerator random(20240607); // fixed seed: the same bytes on every run
    for (char &byte : garbage)
        byte = char(random.bounded(256));
    garbage.replace(1000, 8, QByteArray("\0\0[\0]\0=\0", 9));
    const QByteArray longLine = "[Velloca]\r\nPassword=" + QByteArray(1024 * 1024, 'p') + "\r\nLogErrors=1\r\n";

    QElapsedTimer timer;
    timer.start();
    for (const QByteArray &contents : { garbage, longLine, garbage + longLine + garbage }) {
        const QString path = dir.filePath(QStringLiteral("garbage.vlk"));
        writeFile(path, contents);
        const IniProfile profile = IniProfile::load(path);
        // A second round through the file changes nothing more.
        ASSERT_TRUE(profile.save(path));
        const IniProfile again = IniProfile::load(path);
        EXPECT_EQ(again.toText(), profile.toText());
    }
    const IniProfile profile = IniProfile::fromText(QString::fromUtf8(longLine));
    EXPECT_EQ(profile.readString(QStringLiteral("Velloca"), QStringLiteral("Password"), QString()),
              QString(199, QLatin1Char('p')));
    EXPECT_EQ(profile.readInt(QStringLiteral("Velloca"), QStringLiteral("LogErrors"), 0), 1);
    EXPECT_LT(timer.elapsed(), 20000);
}

TEST(IniProfile, SaveIsAtomicKeepsTheModeAndReplacesOnlyWritableRegularFiles)
{
    QTemporaryDir dir;
    ASSERT_TRUE(dir.isValid());
    const QString path = dir.filePath(QStringLiteral("default.vlk"));
    IniProfile profile;
    profile.writeString(QStringLiteral("Velloca"), QStringLiteral("Password"), QStringLiteral("secret"));

    QString error;
    ASSERT_TRUE(profile.save(path, &error)) << qPrintable(error);
    EXPECT_EQ(fileMode(path), mode_t(0600)) << "new file";
    EXPECT_EQ(folderEntries(dir.path()), QStringList({ "default.vlk" }));

    ASSERT_TRUE(QFile::setPermissions(path, QFileDevice::ReadOwner | QFileDevice::WriteOwner
                                                | QFileDevice::ReadGroup | QFileDevice::ReadOther));
    ASSERT_TRUE(profile.save(path, &error)) << qPrintable(error);
    EXPECT_EQ(fileMode(path), mode_t(0644)) << "replaced file";
    EXPECT_EQ(readFile(path), QByteArray("[Velloca]\r\nPassword=secret\r\n"));
    EXPECT_EQ(folderEntries(dir.path()), QStringList({ "default.vlk" }));

    // A link to the configuration stays a link; its target is replaced.
    const QString link = dir.filePath(QStringLiteral("link.vlk"));
    ASSERT_TRUE(QFile::link(path, link));
    profile.writeInt(QStringLiteral("Velloca"), QStringLiteral("LogErrors"), 1);
    ASSERT_TRUE(profile.save(link, &error)) << qPrintable(error);
    EXPECT_TRUE(QFileInfo(link).isSymLink());
    EXPECT_EQ(IniProfile::load(path).readInt(QStringLiteral("Velloca"), QStringLiteral("LogErrors"), 0), 1);

    // Refused, and left as they are: a FIFO behind a link, and a file
    // without write bits (also for root).
    const QString fifo = dir.filePath(QStringLiteral("fifo"));
    ASSERT_EQ(::mkfifo(QFile::encodeName(fifo).constData(), 0600), 0);
    const QString fifoLink = dir.filePath(QStringLiteral("fifo.vlk"));
    ASSERT_TRUE(QFile::link(fifo, fifoLink));
    EXPECT_FALSE(profile.save(fifoLink, &error));
    EXPECT_TRUE(error.contains(QStringLiteral("not a regular file"))) << qPrintable(error);
    EXPECT_TRUE(QFileInfo(fifoLink).isSymLink());
    struct stat fifoInfo {};
    ASSERT_EQ(::stat(QFile::encodeName(fifo).constData(), &fifoInfo), 0);
    EXPECT_TRUE(S_ISFIFO(fifoInfo.st_mode));
    ASSERT_EQ(::chmod(QFile::encodeName(path).constData(), 0444), 0);
    const QByteArray before = readFile(path);
    EXPECT_FALSE(profile.save(path, &error));
    EXPECT_TRUE(error.contains(QStringLiteral("read-only"))) << qPrintable(error);
    EXPECT_EQ(readFile(path), before);
    EXPECT_EQ(folderEntries(dir.path()), QStringList({ "default.vlk", "fifo", "fifo.vlk", "link.vlk" }));
}

TEST(IniProfile, BytesThatAreNotUtf8ShowInTheCodePageAndStayAsTheyWere)
{
    const QByteArray savedLocale = qgetenv("LC_ALL");
    qputenv("LC_ALL", "de_DE.UTF-8");
    const QByteArray latin1 = "[A]\r\nName=S\xFC" "d\r\nUtf8=S\xC3\xBC" "d\r\n";
    IniProfile profile = IniProfile::fromBytes(latin1);
    EXPECT_EQ(profile.readString(QStringLiteral("A"), QStringLiteral("Name"), QString()), QStringLiteral("Süd"));
    EXPECT_EQ(profile.readString(QStringLiteral("A"), QStringLiteral("Utf8"), QString()), QStringLiteral("Süd"));
    profile.writeString(QStringLiteral("A"), QStringLiteral("Name"), QStringLiteral("Süd"));
    EXPECT_EQ(profile.toBytes(), latin1) << "an unchanged value keeps its bytes";
    profile.writeString(QStringLiteral("A"), QStringLiteral("Name"), QStringLiteral("Nord-Süd"));
    EXPECT_TRUE(profile.toBytes().contains("Name=Nord-S\xFC" "d\r\n")) << "an edit stays in the code page";
    profile.writeString(QStringLiteral("A"), QStringLiteral("Name"), QStringLiteral("東"));
    EXPECT_TRUE(profile.toBytes().contains("Name=\xE6\x9D\xB1\r\n")) << "what the code page cannot hold is UTF-8";

    qputenv("LC_ALL", "ja_JP.UTF-8");
    const QByteArray shiftJis = "[A]\nName=\x83\x56\x83\x8a\x83\x41\x83\x8b\n";
    profile = IniProfile::fromBytes(shiftJis);
    EXPECT_EQ(profile.readString(QStringLiteral("A"), QStringLiteral("Name"), QString()), QStringLiteral("シリアル"));
    EXPECT_EQ(profile.toBytes(), shiftJis);
    qputenv("LC_ALL", savedLocale);
}

TEST(IniProfile, FailedSaveKeepsTheOldFileAndLeavesNothingBehind)
{
    QTemporaryDir dir;
    ASSERT_TRUE(dir.isValid());
    IniProfile profile;
    profile.writeString(QStringLiteral("Velloca"), QStringLiteral("Password"), QStringLiteral("new"));
    QString error;

    const QString noFolder = dir.filePath(QStringLiteral("missing/default.vlk"));
    EXPECT_FALSE(profile.save(noFolder, &error));
    EXPECT_TRUE(error.contains(dir.filePath(QStringLiteral("missing")))) << qPrintable(error);

    const QString plainFile = dir.filePath(QStringLiteral("plain"));
    writeFile(plainFile, "not a folder");
    error.clear();
    EXPECT_FALSE(profile.save(plainFile + QStringLiteral("/default.vlk"), &error));
    EXPECT_TRUE(error.contains(plainFile)) << qPrintable(error);
    EXPECT_EQ(readFile(plainFile), QByteArray("not a folder"));

    // A write that fails part-way (file size limit; root is not exempt).
    const QString path = dir.filePath(QStringLiteral("default.vlk"));
    const QByteArray old = "[Velloca]\r\nPassword=old\r\n";
    writeFile(path, old);
    profile.writeString(QStringLiteral("Velloca"), QStringLiteral("Big"), QString(100000, QLatin1Char('b')));
    struct rlimit saved {};
    ASSERT_EQ(::getrlimit(RLIMIT_FSIZE, &saved), 0);
    const auto savedSignal = std::signal(SIGXFSZ, SIG_IGN);
    struct rlimit small = saved;
    small.rlim_cur = 4096;
    ASSERT_EQ(::setrlimit(RLIMIT_FSIZE, &small), 0);
    error.clear();
    const bool saved_ok = profile.save(path, &error);
    ::setrlimit(RLIMIT_FSIZE, &saved);
    std::signal(SIGXFSZ, savedSignal);

    EXPECT_FALSE(saved_ok);
    EXPECT_TRUE(error.contains(dir.path())) << qPrintable(error);
    EXPECT_EQ(readFile(path), old);
    EXPECT_EQ(folderEntries(dir.path()), QStringList({ "default.vlk", "plain" }));
}
