#include "IniProfile.h"

#include "platform/FileReplace.h"

#include <QFile>
#include <QFileInfo>

#include <algorithm>
#include <limits>

namespace {

constexpr QChar kByteOrderMark(0xFEFF);

QString folded(const QString &name)
{
    return name.trimmed().toCaseFolded();
}

// The name between '[' and the last ']' of a header line, or a null text
// for any other line. A '[' without ']' is no header, as on Windows.
QString headerName(QStringView trimmedLine)
{
    if (!trimmedLine.startsWith(QLatin1Char('[')))
        return QString();
    const qsizetype close = trimmedLine.lastIndexOf(QLatin1Char(']'));
    if (close < 1)
        return QString();
    QString name = trimmedLine.mid(1, close - 1).trimmed().toString();
    if (name.isNull())
        name = QStringLiteral(""); // "[]" is a header too, with an empty name
    return name;
}

// The position of the '=' that ends a non-empty key name, or -1.
qsizetype keyEquals(QStringView line)
{
    const QStringView trimmed = line.trimmed();
    if (trimmed.isEmpty() || trimmed.startsWith(QLatin1Char(';')))
        return -1;
    const qsizetype equals = line.indexOf(QLatin1Char('='));
    if (equals < 0 || line.left(equals).trimmed().isEmpty())
        return -1;
    return equals;
}

int leadingNumber(QStringView text)
{
    qsizetype at = 0;
    while (at < text.size() && text[at].isSpace())
        ++at;
    bool negative = false;
    if (at < text.size() && (text[at] == QLatin1Char('-') || text[at] == QLatin1Char('+'))) {
        negative = text[at] == QLatin1Char('-');
        ++at;
    }
    // Saturates instead of wrapping, so "99999999999" stays a large number.
    constexpr qint64 kLimit = qint64(std::numeric_limits<int>::max()) + 1;
    qint64 magnitude = 0;
    for (; at < text.size(); ++at) {
        const char16_t c = text[at].unicode();
        if (c < u'0' || c > u'9')
            break;
        magnitude = std::min(kLimit, magnitude * 10 + (c - u'0'));
    }
    const qint64 value = negative ? -magnitude : magnitude;
    return int(std::clamp<qint64>(value, std::numeric_limits<int>::min(),
                                  std::numeric_limits<int>::max()));
}

QString cutText(QString text)
{
    const qsizetype nul = text.indexOf(QChar(0));
    if (nul >= 0)
        text.truncate(nul);
    if (text.size() > IniProfile::kMaxTextLength) {
        qsizetype length = IniProfile::kMaxTextLength;
        // Never leave half of a surrogate pair at the end.
        if (text[length - 1].isHighSurrogate())
            --length;
        text.truncate(length);
    }
    return text;
}

QString singleLine(QString value)
{
    value.replace(QLatin1String("\r\n"), QLatin1String(" "));
    value.replace(QLatin1Char('\r'), QLatin1Char(' '));
    value.replace(QLatin1Char('\n'), QLatin1Char(' '));
    return value;
}

} // namespace

IniProfile IniProfile::load(const QString &path, QString *error)
{
    const QFileInfo info(path);
    if (!info.exists())
        return IniProfile();
    // Opening a FIFO would wait for a writer, a device could be endless.
    if (!info.isFile()) {
        if (error)
            *error = QStringLiteral("Cannot read %1: not a regular file").arg(path);
        return IniProfile();
    }
    QFile file(path);
    if (!file.open(QIODevice::ReadOnly)) {
        if (error)
            *error = QStringLiteral("Cannot read %1: %2").arg(path, file.errorString());
        return IniProfile();
    }
    // Read one byte past the limit to notice an oversized file even when it
    // grows while being read. The request is sized by the file, because
    // QFile sets aside the whole amount asked for before reading.
    const QByteArray bytes = file.read(qMin(file.size(), kMaxFileSize) + 1);
    if (bytes.size() > kMaxFileSize || bytes.count('\n') >= kMaxLineCount) {
        if (error) {
            *error = QStringLiteral("%1 is too large for a configuration file (at most %2 bytes "
                                    "and %3 lines)")
                         .arg(path)
                         .arg(kMaxFileSize)
                         .arg(kMaxLineCount);
        }
        return IniProfile();
    }
    if (file.error() != QFileDevice::NoError) {
        if (error)
            *error = QStringLiteral("Cannot read %1: %2").arg(path, file.errorString());
        return IniProfile();
    }
    return fromText(QString::fromUtf8(bytes));
}

IniProfile IniProfile::fromText(const QString &text)
{
    IniProfile profile;
    QStringView rest(text);
    if (rest.startsWith(kByteOrderMark)) {
        profile.m_byteOrderMark = true;
        rest = rest.mid(1);
    }
    while (!rest.isEmpty()) {
        const qsizetype end = rest.indexOf(QLatin1Char('\n'));
        QStringView line = end < 0 ? rest : rest.left(end);
        rest = end < 0 ? QStringView() : rest.mid(end + 1);
        if (line.endsWith(QLatin1Char('\r')))
            line.chop(1);
        profile.appendParsedLine(line.toString());
    }
    return profile;
}

void IniProfile::appendParsedLine(QString text)
{
    const QStringView trimmed = QStringView(text).trimmed();
    const QString name = headerName(trimmed);
    if (!name.isNull()) {
        Section section;
        section.header = std::move(text);
        // A repeated section name stays reachable only through its first section.
        const QString key = folded(name);
        if (!m_sectionIndex.contains(key))
            m_sectionIndex.insert(key, m_sections.size());
        m_sections.append(std::move(section));
        return;
    }
    Section &section = m_sections.last();
    Line line;
    line.equalsAt = keyEquals(text);
    line.text = std::move(text);
    if (line.equalsAt >= 0) {
        const QString key = folded(line.text.left(line.equalsAt));
        if (!section.keyIndex.contains(key))
            section.keyIndex.insert(key, section.lines.size());
        section.lastKeyLine = section.lines.size();
    }
    section.lines.append(std::move(line));
}

QString IniProfile::toText() const
{
    qsizetype length = 1;
    for (const Section &section : m_sections) {
        length += section.header.size() + 2;
        for (const Line &line : section.lines)
            length += line.text.size() + 2;
    }
    QString text;
    text.reserve(length);
    if (m_byteOrderMark)
        text += kByteOrderMark;
    const QLatin1String lineEnd("\r\n");
    for (qsizetype i = 0; i < m_sections.size(); ++i) {
        const Section &section = m_sections[i];
        if (i > 0) {
            text += section.header;
            text += lineEnd;
        }
        for (const Line &line : section.lines) {
            text += line.text;
            text += lineEnd;
        }
    }
    return text;
}

bool IniProfile::save(const QString &path, QString *error) const
{
    // Mode 0600: the file holds a password.
    return replaceFileAtomically(path, toText().toUtf8(), error, 0600);
}

const IniProfile::Line *IniProfile::findKey(const QString &section, const QString &key) const
{
    const auto sectionAt = m_sectionIndex.constFind(folded(section));
    if (sectionAt == m_sectionIndex.cend())
        return nullptr;
    const Section &found = m_sections[*sectionAt];
    const auto lineAt = found.keyIndex.constFind(folded(key));
    if (lineAt == found.keyIndex.cend())
        return nullptr;
    return &found.lines[*lineAt];
}

QString IniProfile::valueOf(const Line &line)
{
    return QStringView(line.text).mid(line.equalsAt + 1).trimmed().toString();
}

int IniProfile::readInt(const QString &section, const QString &key, int defaultValue) const
{
    const Line *line = findKey(section, key);
    if (!line)
        return defaultValue;
    const QString value = cutText(valueOf(*line));
    if (value.isEmpty())
        return defaultValue;
    return leadingNumber(value);
}

QString IniProfile::readString(const QString &section, const QString &key,
                               const QString &defaultValue) const
{
    const Line *line = findKey(section, key);
    return cutText(line ? valueOf(*line) : defaultValue);
}

void IniProfile::writeString(const QString &section, const QString &key, const QString &value)
{
    const QString sectionName = section.trimmed();
    const QString keyName = key.trimmed();
    // A line "=value" would not read back as a key.
    if (keyName.isEmpty())
        return;
    const QString sectionKey = folded(sectionName);
    auto sectionAt = m_sectionIndex.constFind(sectionKey);
    if (sectionAt == m_sectionIndex.cend()) {
        // Keep a blank line between the last section and the new one.
        Section &last = m_sections.last();
        const bool fileEmpty = m_sections.size() == 1 && last.lines.isEmpty();
        const bool endsBlank = !last.lines.isEmpty() && last.lines.last().text.trimmed().isEmpty();
        if (!fileEmpty && !endsBlank)
            last.lines.append(Line());
        Section created;
        created.header = QLatin1Char('[') + sectionName + QLatin1Char(']');
        sectionAt = m_sectionIndex.insert(sectionKey, m_sections.size());
        m_sections.append(std::move(created));
    }
    Section &target = m_sections[*sectionAt];
    const QString text = singleLine(value);
    const QString lineKey = folded(keyName);
    const auto lineAt = target.keyIndex.constFind(lineKey);
    if (lineAt != target.keyIndex.cend()) {
        Line &line = target.lines[*lineAt];
        const QString spelled = QStringView(line.text).left(line.equalsAt).trimmed().toString();
        line.text = spelled + QLatin1Char('=') + text;
        line.equalsAt = spelled.size();
        return;
    }
    // After the last key, so comments and blank lines that close the section
    // stay in front of the next header. No key line follows this position,
    // so the key index stays valid.
    const qsizetype at = target.lastKeyLine + 1;
    Line line;
    line.text = keyName + QLatin1Char('=') + text;
    line.equalsAt = keyName.size();
    target.lines.insert(at, std::move(line));
    target.keyIndex.insert(lineKey, at);
    target.lastKeyLine = at;
}

void IniProfile::writeInt(const QString &section, const QString &key, int value)
{
    writeString(section, key, QString::number(value));
}

bool IniProfile::hasSection(const QString &section) const
{
    return m_sectionIndex.contains(folded(section));
}

bool IniProfile::hasKey(const QString &section, const QString &key) const
{
    return findKey(section, key) != nullptr;
}

QStringList IniProfile::keys(const QString &section) const
{
    QStringList names;
    const auto sectionAt = m_sectionIndex.constFind(folded(section));
    if (sectionAt == m_sectionIndex.cend())
        return names;
    const Section &found = m_sections[*sectionAt];
    for (qsizetype i = 0; i < found.lines.size(); ++i) {
        const Line &line = found.lines[i];
        if (line.equalsAt < 0)
            continue;
        const QString name = QStringView(line.text).left(line.equalsAt).trimmed().toString();
        // Only the first of repeated keys is reachable.
        if (found.keyIndex.value(name.toCaseFolded(), -1) == i)
            names.append(name);
    }
    return names;
}
