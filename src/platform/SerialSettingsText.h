#pragma once

#include <QSerialPort>
#include <QString>

#include <optional>

// A line-settings text such as "19200,E,7,2" taken apart.
struct SerialLineSettings
{
    qint32 baudRate = 9600;
    QSerialPort::Parity parity = QSerialPort::NoParity;
    QSerialPort::DataBits dataBits = QSerialPort::Data8;
    QSerialPort::StopBits stopBits = QSerialPort::OneStop;
};

// Parses "baud,parity,data,stop": parity N E O M S (either case), data bits
// 5..8, stop bits 1, 1.5 or 2. Blanks around fields are allowed. Returns
// nothing for any other text.
std::optional<SerialLineSettings> parseSerialSettings(const QString &text);
QString formatSerialSettings(const SerialLineSettings &settings);
