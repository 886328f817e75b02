#include "platform/core/OxUserLocale.h"

#include <atomic>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <mutex>
#include <vector>

namespace {
// Languages whose regional settings write a decimal comma.
constexpr const char* kDecimalComma[] = {
    "af", "az", "be", "bg", "bs", "ca", "cs", "da", "de", "el", "es", "et", "eu", "fi", "fo", "fr",
    "gl", "hr", "hu", "hy", "id", "is", "it", "ka", "kk", "ky", "lt", "lv", "mk", "mn", "nb", "nl",
    "nn", "no", "pl", "pt", "ro", "ru", "sk", "sl", "sq", "sr", "sv", "tr", "uk", "uz", "vi"};
constexpr const char* kYearFirst[] = {"ja", "ko", "zh", "hu", "lt", "mn", "sv"};

bool inList(const std::string& lang, const char* const* begin, const char* const* end) {
    for (auto p = begin; p != end; ++p)
        if (lang == *p)
            return true;
    return false;
}

std::string envName(const char* const* keys, size_t n) {
    for (size_t i = 0; i < n; ++i) {
        const char* v = std::getenv(keys[i]);
        if (v && *v)
            return v;
    }
    return {};
}

OxUserLocale fromEnvironment() {
    const char* numericKeys[] = {"OXQEL_LOCALE", "LC_ALL", "LC_NUMERIC", "LANG"};
    const char* timeKeys[] = {"OXQEL_LOCALE", "LC_ALL", "LC_TIME", "LANG"};
    OxUserLocale numeric = OxUserLocale::fromName(envName(numericKeys, 4));
    OxUserLocale time = OxUserLocale::fromName(envName(timeKeys, 4));
    OxUserLocale result = numeric;
    result.dateOrder = time.dateOrder;
    result.dateSeparator = time.dateSeparator;
    if (const char* sep = std::getenv("OXQEL_DECIMAL_SEPARATOR"); sep && sep[0] && !sep[1]) {
        result.decimalSeparator = static_cast<wchar_t>(sep[0]);
        result.groupSeparator = sep[0] == ',' ? L'.' : L',';
    }
    if (const char* order = std::getenv("OXQEL_DATE_ORDER")) {
        if (!std::strcmp(order, "MDY"))
            result.dateOrder = OxUserLocale::DateOrder::MDY;
        if (!std::strcmp(order, "DMY"))
            result.dateOrder = OxUserLocale::DateOrder::DMY;
        if (!std::strcmp(order, "YMD"))
            result.dateOrder = OxUserLocale::DateOrder::YMD;
    }
    return result;
}

// Conversions read the locale on every call, from any thread; it is replaced rarely.
// Replaced values stay alive (they are tiny) so a reader never sees a freed one; the
// list owns them until the process ends.
std::atomic<const OxUserLocale*> g_current{nullptr};
std::mutex g_replace;
std::vector<std::unique_ptr<OxUserLocale>> g_installed;

void install(const OxUserLocale& locale) {
    std::lock_guard lock(g_replace);
    g_installed.push_back(std::make_unique<OxUserLocale>(locale));
    g_current.store(g_installed.back().get(), std::memory_order_release);
}
}  // namespace

OxUserLocale OxUserLocale::fromName(std::string_view name) {
    OxUserLocale l;
    std::string lang(name.substr(0, name.find_first_of("_.@")));
    for (auto& c : lang) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
    const std::string_view region = name.find('_') == std::string_view::npos
                                        ? std::string_view{}
                                        : name.substr(name.find('_') + 1, 2);
    if (lang.empty() || lang == "c" || lang == "posix")
        return l;
    if (inList(lang, std::begin(kDecimalComma), std::end(kDecimalComma))) {
        l.decimalSeparator = L',';
        l.groupSeparator = L'.';
    }
    if (lang == "en" && region == "US") {
        l.dateOrder = DateOrder::MDY;
    } else if (inList(lang, std::begin(kYearFirst), std::end(kYearFirst))) {
        l.dateOrder = DateOrder::YMD;
        l.dateSeparator = (lang == "sv" || lang == "lt") ? L'-' : L'/';
    } else {
        l.dateOrder = DateOrder::DMY;
        if (lang == "de" || lang == "ru" || lang == "pl" || lang == "cs" || lang == "fi" ||
            lang == "tr" || lang == "uk" || lang == "nb" || lang == "da")
            l.dateSeparator = L'.';
        else if (lang == "nl")
            l.dateSeparator = L'-';
    }
    return l;
}

OxUserLocale OxUserLocale::current() {
    const OxUserLocale* p = g_current.load(std::memory_order_acquire);
    if (!p) {
        static std::once_flag once;
        std::call_once(once, [] {
            if (!g_current.load(std::memory_order_acquire))
                install(fromEnvironment());
        });
        p = g_current.load(std::memory_order_acquire);
    }
    return *p;
}

void OxUserLocale::setCurrent(const OxUserLocale& locale) {
    install(locale);
}

void OxUserLocale::resetFromEnvironment() {
    install(fromEnvironment());
}
