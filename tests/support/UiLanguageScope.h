#pragma once

#include "localisation/ResourceStrings.h"

// Switches the language in force for one test and restores the previous one.
class UiLanguageScope
{
public:
    explicit UiLanguageScope(UiLanguage language) : m_previous(uiLanguage())
    {
        setUiLanguage(language);
    }
    ~UiLanguageScope() { setUiLanguage(m_previous); }
    UiLanguageScope(const UiLanguageScope &) = delete;
    UiLanguageScope &operator=(const UiLanguageScope &) = delete;

private:
    UiLanguage m_previous;
};
