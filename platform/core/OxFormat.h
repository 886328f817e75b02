#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <type_traits>

#include "platform/core/OxExport.h"

// printf-style formatting for the library's message and statement templates. The
// templates are written as on Windows, where "%s" takes a wide string; here every
// argument carries its type, so "%s" takes wide or UTF-8 text alike and a mismatch
// between a code and its argument degrades to text instead of undefined behaviour.
// Supported: %s %c %d %i %u %x %X %o %f %F %e %E %g %G %%, with flags, width, precision
// and the length letters h l ll z (read and ignored: the argument's own type decides).
class OX_EXPORT OxFormatArg {
public:
    enum class Kind { Signed, Unsigned, Real, WideText, NarrowText, Char };

    template <class T>
    requires(std::is_integral_v<T>&& std::is_signed_v<T> && !std::is_same_v<T, char> &&
             !std::is_same_v<T, wchar_t>) OxFormatArg(T v)
        : m_kind(Kind::Signed), m_signed(v) {}
    template <class T>
    requires(std::is_integral_v<T>&& std::is_unsigned_v<T> && !std::is_same_v<T, bool>)
        OxFormatArg(T v)
        : m_kind(Kind::Unsigned), m_unsigned(v) {}
    template <class T>
    requires std::is_enum_v<T> OxFormatArg(T v)
        : m_kind(Kind::Signed), m_signed(static_cast<long long>(v)) {}
    OxFormatArg(bool v) : m_kind(Kind::Signed), m_signed(v ? 1 : 0) {}
    OxFormatArg(double v) : m_kind(Kind::Real), m_real(v) {}
    OxFormatArg(float v) : m_kind(Kind::Real), m_real(v) {}
    OxFormatArg(char c) : m_kind(Kind::Char), m_signed(static_cast<unsigned char>(c)) {}
    OxFormatArg(wchar_t c) : m_kind(Kind::Char), m_signed(c) {}
    OxFormatArg(const wchar_t* s) : m_kind(Kind::WideText), m_wide(s ? s : L"") {}
    OxFormatArg(const std::wstring& s) : m_kind(Kind::WideText), m_wide(s) {}
    OxFormatArg(std::wstring_view s) : m_kind(Kind::WideText), m_wide(s) {}
    OxFormatArg(const char* s) : m_kind(Kind::NarrowText), m_narrow(s ? s : "") {}
    OxFormatArg(const std::string& s) : m_kind(Kind::NarrowText), m_narrow(s) {}

    Kind kind() const { return m_kind; }
    long long asSigned() const;
    unsigned long long asUnsigned() const;
    double asReal() const;
    std::wstring asText() const;

private:
    Kind m_kind;
    long long m_signed = 0;
    unsigned long long m_unsigned = 0;
    double m_real = 0;
    std::wstring_view m_wide;
    std::string_view m_narrow;
};

OX_EXPORT std::wstring oxFormatArgs(std::wstring_view format, const OxFormatArg* args,
                                    size_t count);

template <class... Args>
std::wstring oxFormat(std::wstring_view format, const Args&... args) {
    if constexpr (sizeof...(Args) == 0) {
        return oxFormatArgs(format, nullptr, 0);
    } else {
        const OxFormatArg list[] = {OxFormatArg(args)...};
        return oxFormatArgs(format, list, sizeof...(Args));
    }
}
