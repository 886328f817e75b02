#pragma once

#include <string>
#include <string_view>

#include "platform/core/OxExport.h"

// The user's regional settings that the platform's conversions follow (decimal
// separator, date order). On Windows they come from the control panel; here they are
// read once from the environment and can be replaced by the host or a test.
//
// Environment, first match wins: OXQEL_LOCALE, LC_ALL, LC_NUMERIC (separators) or
// LC_TIME (date order), LANG; a name such as "de_DE.UTF-8". OXQEL_DECIMAL_SEPARATOR and
// OXQEL_DATE_ORDER (MDY, DMY or YMD) override single settings.
class OX_EXPORT OxUserLocale {
public:
    enum class DateOrder { MDY, DMY, YMD };

    wchar_t decimalSeparator = L'.';
    wchar_t groupSeparator = L',';
    wchar_t dateSeparator = L'/';
    DateOrder dateOrder = DateOrder::MDY;

    // The settings of a locale name ("fr_FR.UTF-8", "en_US", "C"); unknown names give
    // the defaults above.
    static OxUserLocale fromName(std::string_view name);

    static OxUserLocale current();
    static void setCurrent(const OxUserLocale& locale);
    // Reads the environment again (tests that change it).
    static void resetFromEnvironment();

    bool operator==(const OxUserLocale&) const = default;
};
