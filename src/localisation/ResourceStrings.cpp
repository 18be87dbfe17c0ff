#include "ResourceStrings.h"

#include "ResourceStringTable.h"

#include <QLocale>

#include <optional>

namespace {

std::optional<UiLanguage> &languageInForce()
{
    static std::optional<UiLanguage> language;
    return language;
}

} // namespace

UiLanguage systemUiLanguage()
{
    // The POSIX order of precedence for message texts; LANGUAGE is a
    // gettext-only list and is not consulted.
    for (const char *name : { "LC_ALL", "LC_MESSAGES", "LANG" }) {
        const QString value = qEnvironmentVariable(name).trimmed();
        if (!value.isEmpty())
            return value.startsWith(QLatin1String("ja")) ? UiLanguage::Japanese : UiLanguage::English;
    }
    return QLocale::system().language() == QLocale::Japanese ? UiLanguage::Japanese
                                                              : UiLanguage::English;
}

void setUiLanguage(UiLanguage language)
{
    languageInForce() = language;
}

UiLanguage uiLanguage()
{
    std::optional<UiLanguage> &language = languageInForce();
    if (!language)
        language = systemUiLanguage();
    return *language;
}

QString LoadResString(int id)
{
    const ResourceStringEntry *entry = findResourceString(id);
    if (!entry)
        return {};
    return QString::fromUtf8(uiLanguage() == UiLanguage::Japanese ? entry->japanese
                                                                   : entry->english);
}

bool hasResString(int id)
{
    return findResourceString(id) != nullptr;
}

QList<int> resStringIds()
{
    QList<int> ids;
    for (const ResourceStringEntry &entry : resourceStringTable())
        ids.append(entry.id);
    return ids;
}
