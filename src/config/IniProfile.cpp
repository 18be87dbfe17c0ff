#include "IniProfile.h"

#include "LegacyText.h"
#include "platform/FileReplace.h"

#include <QFile>
#include <QFileInfo>

#include <algorithm>
#include <limits>

namespace {

constexpr QByteArrayView kUtf8ByteOrderMark("\xEF\xBB\xBF");

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
    return fromBytes(bytes);
}

IniProfile IniProfile::fromBytes(const QByteArray &bytes)
{
    IniProfile profile;
    QByteArrayView rest(bytes);
    if (rest.startsWith(kUtf8ByteOrderMark)) {
        profile.m_byteOrderMark = true;
        rest = rest.sliced(kUtf8ByteOrderMark.size());
    }
    bool firstLineEnd = true;
    while (!rest.isEmpty()) {
        const qsizetype end = rest.indexOf('\n');
        QByteArrayView line = end < 0 ? rest : rest.first(end);
        rest = end < 0 ? QByteArrayView() : rest.sliced(end + 1);
        const bool carriageReturn = line.endsWith('\r');
        if (carriageReturn)
            line.chop(1);
        if (end >= 0 && firstLineEnd) {
            profile.m_lineFeedOnly = !carriageReturn;
            firstLineEnd = false;
        }
        const QByteArray raw = line.toByteArray();
        bool legacy = false;
        QString text = decodeConfigurationBytes(raw, &legacy);
        // A last line without an end gets the file's usual one.
        const bool lineFeedOnly = end >= 0 ? !carriageReturn : profile.m_lineFeedOnly;
        profile.appendParsedLine(std::move(text), legacy ? raw : QByteArray(), lineFeedOnly);
    }
    return profile;
}

IniProfile IniProfile::fromText(const QString &text)
{
    return fromBytes(text.toUtf8());
}

IniProfile::Line IniProfile::newLine(QString text) const
{
    Line line;
    line.equalsAt = keyEquals(text);
    line.text = std::move(text);
    line.lineFeedOnly = m_lineFeedOnly;
    return line;
}

void IniProfile::appendParsedLine(QString text, QByteArray legacyBytes, bool lineFeedOnly)
{
    const QStringView trimmed = QStringView(text).trimmed();
    const QString name = headerName(trimmed);
    if (!name.isNull()) {
        Section section;
        section.header = std::move(text);
        section.headerLegacyBytes = std::move(legacyBytes);
        section.headerLineFeedOnly = lineFeedOnly;
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
    line.legacyBytes = std::move(legacyBytes);
    line.lineFeedOnly = lineFeedOnly;
    if (line.equalsAt >= 0) {
        const QString key = folded(line.text.left(line.equalsAt));
        if (!section.keyIndex.contains(key))
            section.keyIndex.insert(key, section.lines.size());
        section.lastKeyLine = section.lines.size();
    }
    section.lines.append(std::move(line));
}

template<typename Visit>
void IniProfile::forEachLine(Visit visit) const
{
    for (qsizetype i = 0; i < m_sections.size(); ++i) {
        const Section &section = m_sections[i];
        if (i > 0)
            visit(section.header, section.headerLegacyBytes, section.headerLineFeedOnly);
        for (const Line &line : section.lines)
            visit(line.text, line.legacyBytes, line.lineFeedOnly);
    }
}

QString IniProfile::toText() const
{
    QString text;
    if (m_byteOrderMark)
        text += QChar(0xFEFF);
    forEachLine([&](const QString &line, const QByteArray &, bool lineFeedOnly) {
        text += line;
        text += lineFeedOnly ? QLatin1String("\n") : QLatin1String("\r\n");
    });
    return text;
}

QByteArray IniProfile::toBytes() const
{
    QByteArray bytes;
    if (m_byteOrderMark)
        bytes += kUtf8ByteOrderMark;
    forEachLine([&](const QString &line, const QByteArray &legacyBytes, bool lineFeedOnly) {
        bytes += legacyBytes.isEmpty() ? line.toUtf8() : legacyBytes;
        bytes += lineFeedOnly ? QByteArrayView("\n") : QByteArrayView("\r\n");
    });
    return bytes;
}

bool IniProfile::save(const QString &path, QString *error) const
{
    // A new file gets mode 0600: it holds a password.
    return replaceFileAtomically(path, toBytes(), error, 0600);
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

qsizetype IniProfile::sectionIndexFor(const QString &sectionName)
{
    const QString sectionKey = folded(sectionName);
    const auto sectionAt = m_sectionIndex.constFind(sectionKey);
    if (sectionAt != m_sectionIndex.cend())
        return *sectionAt;
    // Keep a blank line between the last section and the new one.
    Section &last = m_sections.last();
    const bool fileEmpty = m_sections.size() == 1 && last.lines.isEmpty();
    const bool endsBlank = !last.lines.isEmpty() && last.lines.last().text.trimmed().isEmpty();
    if (!fileEmpty && !endsBlank)
        last.lines.append(newLine(QString()));
    Section created;
    created.header = QLatin1Char('[') + sectionName.trimmed() + QLatin1Char(']');
    created.headerLineFeedOnly = m_lineFeedOnly;
    m_sectionIndex.insert(sectionKey, m_sections.size());
    m_sections.append(std::move(created));
    return m_sections.size() - 1;
}

void IniProfile::writeString(const QString &section, const QString &key, const QString &value)
{
    const QString sectionName = section.trimmed();
    const QString keyName = key.trimmed();
    // A line "=value" would not read back as a key.
    if (keyName.isEmpty())
        return;
    Section &target = m_sections[sectionIndexFor(sectionName)];
    const QString text = singleLine(value);
    const QString lineKey = folded(keyName);
    const auto lineAt = target.keyIndex.constFind(lineKey);
    if (lineAt != target.keyIndex.cend()) {
        Line &line = target.lines[*lineAt];
        // The same value keeps the line as it stands, bytes and spelling.
        if (valueOf(line) == text.trimmed())
            return;
        const QString spelled = QStringView(line.text).left(line.equalsAt).trimmed().toString();
        line.text = spelled + QLatin1Char('=') + text;
        line.equalsAt = spelled.size();
        // A line in the legacy code page stays in it where it can.
        if (!line.legacyBytes.isEmpty())
            line.legacyBytes = encodeLegacy(line.text);
        return;
    }
    // After the last key, so comments and blank lines that close the section
    // stay in front of the next header. No key line follows this position,
    // so the key index stays valid.
    const qsizetype at = target.lastKeyLine + 1;
    target.lines.insert(at, newLine(keyName + QLatin1Char('=') + text));
    target.keyIndex.insert(lineKey, at);
    target.lastKeyLine = at;
}

void IniProfile::writeInt(const QString &section, const QString &key, int value)
{
    writeString(section, key, QString::number(value));
}

void IniProfile::removeKey(const QString &section, const QString &key)
{
    const auto sectionAt = m_sectionIndex.constFind(folded(section));
    if (sectionAt == m_sectionIndex.cend())
        return;
    Section &found = m_sections[*sectionAt];
    const QString name = folded(key);
    const auto before = found.lines.size();
    found.lines.removeIf([&](const Line &line) {
        return line.equalsAt >= 0 && folded(line.text.left(line.equalsAt)) == name;
    });
    if (found.lines.size() != before)
        reindex();
}

std::optional<IniProfile::SectionCopy> IniProfile::copySection(const QString &section) const
{
    const auto sectionAt = m_sectionIndex.constFind(folded(section));
    if (sectionAt == m_sectionIndex.cend())
        return std::nullopt;
    return SectionCopy { m_sections[*sectionAt].lines };
}

void IniProfile::pasteSection(const QString &section, const std::optional<SectionCopy> &copy)
{
    if (!copy) {
        removeSection(section);
        return;
    }
    Section &target = m_sections[sectionIndexFor(section)];
    target.lines = copy->lines;
    indexKeys(target);
}

void IniProfile::removeSection(const QString &section)
{
    const QString name = folded(section);
    const auto before = m_sections.size();
    // Every section of that name goes, repeated ones too: none may be read
    // in place of the one removed.
    for (qsizetype i = m_sections.size() - 1; i > 0; --i) {
        if (folded(headerName(QStringView(m_sections[i].header).trimmed())) == name)
            m_sections.removeAt(i);
    }
    if (m_sections.size() != before)
        reindex();
}

QStringList IniProfile::sectionNames() const
{
    QStringList names;
    for (qsizetype i = 1; i < m_sections.size(); ++i)
        names << headerName(QStringView(m_sections[i].header).trimmed());
    return names;
}

void IniProfile::reindex()
{
    m_sectionIndex.clear();
    for (qsizetype i = 0; i < m_sections.size(); ++i) {
        Section &section = m_sections[i];
        if (i > 0) {
            const QString key = folded(headerName(QStringView(section.header).trimmed()));
            if (!m_sectionIndex.contains(key))
                m_sectionIndex.insert(key, i);
        }
        indexKeys(section);
    }
}

void IniProfile::indexKeys(Section &section)
{
    section.keyIndex.clear();
    section.lastKeyLine = -1;
    for (qsizetype at = 0; at < section.lines.size(); ++at) {
        const Line &line = section.lines[at];
        if (line.equalsAt < 0)
            continue;
        const QString key = folded(line.text.left(line.equalsAt));
        if (!section.keyIndex.contains(key))
            section.keyIndex.insert(key, at);
        section.lastKeyLine = at;
    }
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
