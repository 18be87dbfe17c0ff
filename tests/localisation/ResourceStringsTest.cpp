#include "support/UiLanguageScope.h"

#include <QRegularExpression>
#include <QSet>

#include <gtest/gtest.h>

#include <algorithm>
#include <map>
#include <optional>

namespace {

QList<int> idRange(int first, int last)
{
    QList<int> ids;
    for (int id = first; id <= last; ++id)
        ids.append(id);
    return ids;
}

// The identifiers the program uses, written out independently of the table.
QSet<int> expectedIds()
{
    QList<int> ids = { 20, 21, 1204, 1207, 1208, 1301, 1604, 1605 };
    ids += idRange(2101, 2114);
    ids += idRange(2120, 2132);
    ids += idRange(2202, 2220);
    ids += { 4006, 4023, 4024, 4025, 4026, 4030, 4031, 4032 };
    ids += idRange(5000, 5059);
    ids += idRange(5061, 5065);
    ids += 5073;
    ids += idRange(5082, 5115);
    ids += idRange(5118, 5120);
    ids += idRange(5122, 5124);
    ids += idRange(5201, 5205);
    return QSet<int>(ids.begin(), ids.end());
}

QString textIn(UiLanguage language, int id)
{
    UiLanguageScope scope(language);
    return LoadResString(id);
}

// The accelerator letter of a caption ("E&xit" → 'x'), none for "&&" or no '&'.
std::optional<QChar> accelerator(const QString &text)
{
    static const QRegularExpression pattern(QStringLiteral("&([^&])"));
    const QRegularExpressionMatch match = pattern.match(text);
    if (!match.hasMatch())
        return std::nullopt;
    return match.captured(1).at(0).toUpper();
}

// Environment variables changed by a test, put back as they were.
class EnvironmentScope
{
public:
    void set(const char *name, const QByteArray &value)
    {
        remember(name);
        qputenv(name, value);
    }
    void unset(const char *name)
    {
        remember(name);
        qunsetenv(name);
    }
    ~EnvironmentScope()
    {
        for (const auto &[name, value] : m_saved) {
            if (value)
                qputenv(name.c_str(), *value);
            else
                qunsetenv(name.c_str());
        }
    }

private:
    void remember(const char *name)
    {
        if (m_saved.count(name))
            return;
        m_saved[name] = qEnvironmentVariableIsSet(name) ? std::optional(qgetenv(name)) : std::nullopt;
    }
    std::map<std::string, std::optional<QByteArray>> m_saved;
};

} // namespace

TEST(ResourceStrings, TableHoldsEveryIdentifierInBothLanguages)
{
    const QList<int> ids = resStringIds();
    EXPECT_EQ(QSet<int>(ids.begin(), ids.end()), expectedIds());
    EXPECT_TRUE(std::is_sorted(ids.begin(), ids.end()));

    // Texts that are names or already Japanese-usable stay as they are.
    const QSet<int> sameInBoth = { 1207, 2214, 2216, 2219 };
    for (int id : ids) {
        SCOPED_TRACE(id);
        EXPECT_TRUE(hasResString(id));
        const QString english = textIn(UiLanguage::English, id);
        const QString japanese = textIn(UiLanguage::Japanese, id);
        EXPECT_FALSE(english.isEmpty());
        EXPECT_FALSE(japanese.isEmpty());
        if (sameInBoth.contains(id))
            EXPECT_EQ(japanese, english);
        else
            EXPECT_NE(japanese, english);
        // Code appends details behind these, in either language.
        EXPECT_EQ(japanese.endsWith(u' '), english.endsWith(u' '));
        EXPECT_EQ(accelerator(japanese), accelerator(english));
    }
    // The highest port number, as the port check uses it.
    EXPECT_TRUE(textIn(UiLanguage::Japanese, 5102).contains(QStringLiteral(" 65535 ")));
}

TEST(ResourceStrings, SystemLanguageFollowsLocaleEnvironment)
{
    EnvironmentScope environment;
    environment.unset("LC_ALL");
    environment.unset("LC_MESSAGES");
    environment.set("LANG", "ja_JP.UTF-8");
    EXPECT_EQ(systemUiLanguage(), UiLanguage::Japanese);

    environment.set("LANG", "en_GB.UTF-8");
    EXPECT_EQ(systemUiLanguage(), UiLanguage::English);

    // LC_MESSAGES outranks LANG, LC_ALL outranks both; empty ones are skipped.
    environment.set("LC_MESSAGES", "ja_JP.UTF-8");
    EXPECT_EQ(systemUiLanguage(), UiLanguage::Japanese);
    environment.set("LC_ALL", "C");
    EXPECT_EQ(systemUiLanguage(), UiLanguage::English);
    environment.set("LC_ALL", "");
    EXPECT_EQ(systemUiLanguage(), UiLanguage::Japanese);
}
