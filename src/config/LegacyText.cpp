#include "LegacyText.h"

#include <QStringDecoder>
#include <QStringEncoder>

QByteArray legacyCodecName()
{
    for (const char *name : { "LC_ALL", "LC_CTYPE", "LANG" }) {
        const QByteArray value = qgetenv(name).trimmed();
        if (!value.isEmpty())
            return value.startsWith("ja") ? QByteArrayLiteral("windows-31j") : QByteArrayLiteral("windows-1252");
    }
    return QByteArrayLiteral("windows-1252");
}

QString decodeConfigurationBytes(const QByteArray &bytes, bool *wasLegacy)
{
    QStringDecoder utf8(QStringDecoder::Utf8, QStringDecoder::Flag::Stateless);
    QString text = utf8.decode(bytes);
    *wasLegacy = utf8.hasError();
    if (!*wasLegacy)
        return text;
    QStringDecoder legacy(legacyCodecName().constData());
    // Latin-1 maps every byte to a character, so it is the last resort
    // where the code page is not available.
    return legacy.isValid() ? QString(legacy.decode(bytes)) : QString::fromLatin1(bytes);
}

QByteArray encodeLegacy(const QString &text)
{
    QStringEncoder encoder(legacyCodecName().constData(), QStringEncoder::Flag::Stateless);
    if (!encoder.isValid())
        return QByteArray();
    QByteArray bytes = encoder.encode(text);
    if (encoder.hasError())
        return QByteArray();
    // Characters the code page lacks may be replaced rather than flagged.
    bool legacy = false;
    if (decodeConfigurationBytes(bytes, &legacy) != text)
        return QByteArray();
    return bytes;
}
