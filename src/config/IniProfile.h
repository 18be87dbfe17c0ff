#pragma once

#include <QHash>
#include <QList>
#include <QString>
#include <QStringList>

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
// The file is read as UTF-8 (invalid bytes become U+FFFD) and written as
// UTF-8 with CR LF line ends; LF and CR LF are both accepted on reading.
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
    static IniProfile fromText(const QString &text);

    // Writes the whole profile atomically (replaceFileAtomically, mode 0600); on failure the
    // old file stays as it was and error names the path and the cause.
    bool save(const QString &path, QString *error = nullptr) const;
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
    };

    struct Section
    {
        QString header; // the header line as in the file; empty before the first header
        QList<Line> lines; // the lines after the header
        QHash<QString, qsizetype> keyIndex; // folded key name -> first line with that key
        qsizetype lastKeyLine = -1;
    };

    const Line *findKey(const QString &section, const QString &key) const;
    void appendParsedLine(QString text);
    static QString valueOf(const Line &line);

    // m_sections[0] holds the lines before the first header and has no header.
    QList<Section> m_sections { Section() };
    QHash<QString, qsizetype> m_sectionIndex; // folded name -> first section with that name
    bool m_byteOrderMark = false;
};
