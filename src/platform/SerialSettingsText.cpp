#include "SerialSettingsText.h"

#include <QStringList>

namespace {

std::optional<QSerialPort::Parity> parityFromLetter(const QString &field)
{
    if (field.size() != 1)
        return std::nullopt;
    switch (field.at(0).toUpper().toLatin1()) {
    case 'N': return QSerialPort::NoParity;
    case 'E': return QSerialPort::EvenParity;
    case 'O': return QSerialPort::OddParity;
    case 'M': return QSerialPort::MarkParity;
    case 'S': return QSerialPort::SpaceParity;
    default: return std::nullopt;
    }
}

QChar letterFromParity(QSerialPort::Parity parity)
{
    switch (parity) {
    case QSerialPort::EvenParity: return u'E';
    case QSerialPort::OddParity: return u'O';
    case QSerialPort::MarkParity: return u'M';
    case QSerialPort::SpaceParity: return u'S';
    default: return u'N';
    }
}

std::optional<QSerialPort::StopBits> stopBitsFromText(const QString &field)
{
    if (field == u"1")
        return QSerialPort::OneStop;
    if (field == u"1.5")
        return QSerialPort::OneAndHalfStop;
    if (field == u"2")
        return QSerialPort::TwoStop;
    return std::nullopt;
}

} // namespace

std::optional<SerialLineSettings> parseSerialSettings(const QString &text)
{
    const QStringList fields = text.split(u',');
    if (fields.size() != 4)
        return std::nullopt;

    bool ok = false;
    const qint32 baud = fields[0].trimmed().toInt(&ok);
    if (!ok || baud <= 0)
        return std::nullopt;
    const auto parity = parityFromLetter(fields[1].trimmed());
    const int dataBits = fields[2].trimmed().toInt(&ok);
    if (!parity || !ok || dataBits < 5 || dataBits > 8)
        return std::nullopt;
    const auto stopBits = stopBitsFromText(fields[3].trimmed());
    if (!stopBits)
        return std::nullopt;

    return SerialLineSettings { baud, *parity, QSerialPort::DataBits(dataBits), *stopBits };
}

QString formatSerialSettings(const SerialLineSettings &settings)
{
    const QString stop = settings.stopBits == QSerialPort::OneAndHalfStop ? QStringLiteral("1.5")
                                                                          : QString::number(int(settings.stopBits));
    return QStringLiteral("%1,%2,%3,%4")
        .arg(settings.baudRate)
        .arg(letterFromParity(settings.parity))
        .arg(int(settings.dataBits))
        .arg(stop);
}
