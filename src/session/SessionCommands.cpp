// Commands other programs send to a session through the command channel:
// [ACTIVATE], [DEACTIVATE] and [COMSETTINGS=baud,parity,databits,stopbits].
#include "SessionEngine.h"

#include "NumberText.h"
#include "platform/SerialPortControl.h"

#include <cmath>

namespace {

const QString kComSettingsPrefix = QStringLiteral("[COMSETTINGS=");

int indexOf(const QStringList &entries, const QString &text)
{
    return int(entries.indexOf(text));
}

int parityIndex(const QString &field)
{
    static const QStringList words { "NONE", "EVEN", "ODD", "MARK", "SPACE" };
    static const QStringList letters { "N", "E", "O", "M", "S" };
    const int word = indexOf(words, field);
    return word >= 0 ? word : indexOf(letters, field);
}

} // namespace

bool SessionEngine::executeCommand(const QString &command)
{
    const QString text = command.toUpper().trimmed();
    if (text == QStringLiteral("[ACTIVATE]") || text == QStringLiteral("[DEACTIVATE]")) {
        // Only a real change counts: activating an active session is refused.
        if (isActive() == (text == QStringLiteral("[ACTIVATE]")))
            return false;
        Command1_Click();
        return true;
    }
    if (text.startsWith(kComSettingsPrefix))
        return applyComSettings(text.mid(kComSettingsPrefix.size()).remove(u']'));
    return false;
}

bool SessionEngine::applyComSettings(QString fields)
{
    const SessionSettings before = m_settings;
    auto take = [&fields](bool trimRest) {
        const qsizetype comma = fields.indexOf(u',');
        const QString field = fields.left(comma);
        fields = fields.mid(comma + 1);
        if (trimRest)
            fields = fields.trimmed();
        return field;
    };
    auto select = [](int &setting, int index) {
        if (index >= 0)
            setting = index;
    };
    if (fields.contains(u',')) {
        const double baud = leadingNumber(take(false));
        select(m_settings.BaudRate, indexOf(SessionLists::kBaudRates, QString::number(std::lround(baud))));
        if (fields.contains(u',')) {
            select(m_settings.Parity, parityIndex(take(false)));
            if (fields.contains(u',')) {
                select(m_settings.Databits, indexOf(SessionLists::kDataBits, take(true).trimmed()));
                if (!fields.isEmpty())
                    select(m_settings.Stopbits, indexOf(SessionLists::kStopBits, fields));
            }
        }
    }
    // The port gets the lists as they now stand, even when no field changed.
    if (!m_serialPort->setSettings(serialSettingsText())) {
        // A combination the device refuses: keep the running session as it was.
        m_settings = before;
        return false;
    }
    Q_EMIT serialSettingsChanged();
    return true;
}
