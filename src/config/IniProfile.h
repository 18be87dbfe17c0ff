#pragma once

#include <QByteArray>
#include <QHash>
#include <QList>
#include <QString>
#include <QStringList>

#include <optional>

// An INI file held in memory, read and written one key at a time the way
// the Windows private-profile functions do it:
//
// - Section and key names match case-insensitively; blanks around names,
//   around the equals sign and around values are ignored. The first of
//   several equal sections or keys is the one read and written.
// - Every line the program does not write keeps its text and its place:
//   comments (first non-blank character ';'), blank lines, text before the
//   first section, unknown sections and keys, lines without an equals sign.
// - A written key replaces the value of the existing line ("Key=value",
//   keeping the name as the file spells it); a new key goes after the last
//   key of its section, a new section at the end of the file.
//
// Each line is read as UTF-8 when it is valid UTF-8 and otherwise in the
// legacy code page (LegacyText.h). A line the program does not change is
// written back as the bytes it was read as, with the file's own line end
// (new lines end like the file's first line, CR LF in a new file); writing a value equal to the one held changes
// nothing. A changed line that was not UTF-8 stays in its code page when the
// code page can hold the new text.
class IniProfile
{
public:
    // Texts are read into a buffer of 200 characters including the
    // terminator, so longer values arrive cut to this length.
    static constexpr int kMaxTextLength = 199;
    // Larger files are not configuration files (a thousand sessions take
    // about 1 MB); holding one would only cost memory and time. They load as
    // empty profiles with an error text.
    static constexpr qint64 kMaxFileSize = 16 * 1024 * 1024;
    static constexpr qsizetype kMaxLineCount = 1'000'000;

    // A missing file gives an empty profile and leaves error untouched; an
    // unreadable or oversized file gives an empty profile and an error text
    // naming the path.
    static IniProfile load(const QString &path, QString *error = nullptr);
    static IniProfile fromBytes(const QByteArray &bytes);
    static IniProfile fromText(const QString &text);

    // Writes the whole profile atomically (replaceFileAtomically; a new file
    // gets mode 0600); on failure the old file stays as it was and error
    // names the path and the cause.
    bool save(const QString &path, QString *error = nullptr) const;
    QByteArray toBytes() const;
    QString toText() const;

    // The leading decimal number of the value: blanks skipped, optional sign,
    // digits up to the first other character; a value that does not start
    // with a number reads as 0. Numbers beyond the int range are clamped to
    // INT_MIN / INT_MAX. A missing section or key, or an empty value, gives
    // defaultValue.
    int readInt(const QString &section, const QString &key, int defaultValue) const;
    // The value up to its first NUL character, cut to kMaxTextLength
    // characters; defaultValue (cut the same way) when the key is missing.
    QString readString(const QString &section, const QString &key,
                       const QString &defaultValue) const;

    // Line breaks in value would split the line; they are written as blanks.
    // Blanks at either end of value do not survive a read, as on Windows.
    void writeString(const QString &section, const QString &key, const QString &value);
    void writeInt(const QString &section, const QString &key, int value);

    void removeKey(const QString &section, const QString &key);

    // A section's lines, to carry it into another profile. Empty when the
    // profile has no such section.
    struct SectionCopy;
    std::optional<SectionCopy> copySection(const QString &section) const;
    // Replaces the lines of section (creating it at the end when missing)
    // with those of copy; a missing copy removes the section.
    void pasteSection(const QString &section, const std::optional<SectionCopy> &copy);
    void removeSection(const QString &section);
    // The names of the sections in file order, as the file spells them.
    QStringList sectionNames() const;

    bool hasSection(const QString &section) const;
    bool hasKey(const QString &section, const QString &key) const;
    // The names of the keys of section in file order, as the file spells
    // them, each name once.
    QStringList keys(const QString &section) const;

private:
    struct Line
    {
        QString text; // the line as in the file, without its line end
        qsizetype equalsAt = -1; // position of the '=' of a key line, -1 for other lines
        QByteArray legacyBytes; // the line's bytes when they are not UTF-8
        bool lineFeedOnly = false; // ended with LF alone, not CR LF
    };

    struct Section
    {
        QString header; // the header line as in the file; empty before the first header
        QByteArray headerLegacyBytes;
        bool headerLineFeedOnly = false;
        QList<Line> lines; // the lines after the header
        QHash<QString, qsizetype> keyIndex; // folded key name -> first line with that key
        qsizetype lastKeyLine = -1;
    };

    const Line *findKey(const QString &section, const QString &key) const;
    void appendParsedLine(QString text, QByteArray legacyBytes = QByteArray(), bool lineFeedOnly = false);
    Line newLine(QString text) const;
    template<typename Visit>
    void forEachLine(Visit visit) const;
    qsizetype sectionIndexFor(const QString &sectionName); // creates a missing section
    void reindex();
    static void indexKeys(Section &section);
    static QString valueOf(const Line &line);

    // m_sections[0] holds the lines before the first header and has no header.
    QList<Section> m_sections { Section() };
    QHash<QString, qsizetype> m_sectionIndex; // folded name -> first section with that name
    bool m_byteOrderMark = false;
    bool m_lineFeedOnly = false; // the file's first line ends with LF alone: new lines do too
};

struct IniProfile::SectionCopy
{
    QList<Line> lines;
};
