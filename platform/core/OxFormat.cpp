#include "platform/core/OxFormat.h"

#include <cstdio>

#include "platform/core/OxText.h"

long long OxFormatArg::asSigned() const {
    switch (m_kind) {
        case Kind::Signed:
        case Kind::Char:
            return m_signed;
        case Kind::Unsigned:
            return static_cast<long long>(m_unsigned);
        case Kind::Real:
            return static_cast<long long>(m_real);
        default:
            return 0;
    }
}

unsigned long long OxFormatArg::asUnsigned() const {
    switch (m_kind) {
        case Kind::Signed:
        case Kind::Char:
            return static_cast<unsigned long long>(m_signed);
        case Kind::Unsigned:
            return m_unsigned;
        case Kind::Real:
            return static_cast<unsigned long long>(m_real);
        default:
            return 0;
    }
}

double OxFormatArg::asReal() const {
    switch (m_kind) {
        case Kind::Signed:
        case Kind::Char:
            return static_cast<double>(m_signed);
        case Kind::Unsigned:
            return static_cast<double>(m_unsigned);
        case Kind::Real:
            return m_real;
        default:
            return 0;
    }
}

std::wstring OxFormatArg::asText() const {
    switch (m_kind) {
        case Kind::WideText:
            return std::wstring(m_wide);
        case Kind::NarrowText:
            return OxText::fromUtf8(m_narrow);
        case Kind::Char:
            return std::wstring(1, static_cast<wchar_t>(m_signed));
        case Kind::Signed:
            return std::to_wstring(m_signed);
        case Kind::Unsigned:
            return std::to_wstring(m_unsigned);
        case Kind::Real: {
            char buf[64];
            std::snprintf(buf, sizeof buf, "%g", m_real);
            return OxText::fromUtf8(buf);
        }
    }
    return {};
}

namespace {
struct Directive {
    std::string flags;
    int width = -1;
    int precision = -1;
    wchar_t conversion = 0;
};

void pad(std::wstring& out, const std::wstring& body, const Directive& directive) {
    const bool left = directive.flags.find('-') != std::string::npos;
    const size_t width = directive.width > 0 ? static_cast<size_t>(directive.width) : 0;
    if (body.size() >= width) {
        out += body;
    } else if (left) {
        out += body;
        out.append(width - body.size(), L' ');
    } else {
        out.append(width - body.size(), L' ');
        out += body;
    }
}

// Numbers go through the C formatter with a narrow format we build ourselves, so the
// result never depends on the argument matching the letter.
std::wstring formatNumber(const Directive& directive, const OxFormatArg& arg) {
    std::string fmt = "%" + directive.flags;
    if (directive.width >= 0)
        fmt += std::to_string(directive.width);
    if (directive.precision >= 0)
        fmt += "." + std::to_string(directive.precision);
    char buf[512];
    const char c = static_cast<char>(directive.conversion);
    switch (directive.conversion) {
        case L'd':
        case L'i':
            fmt += "lld";
            std::snprintf(buf, sizeof buf, fmt.c_str(), arg.asSigned());
            break;
        case L'u':
        case L'x':
        case L'X':
        case L'o':
            fmt += "ll";
            fmt += c;
            std::snprintf(buf, sizeof buf, fmt.c_str(), arg.asUnsigned());
            break;
        default:
            fmt += c;
            std::snprintf(buf, sizeof buf, fmt.c_str(), arg.asReal());
            break;
    }
    return OxText::fromUtf8(buf);
}
}  // namespace

std::wstring oxFormatArgs(std::wstring_view format, const OxFormatArg* args, size_t count) {
    std::wstring out;
    out.reserve(format.size() + 16 * count);
    size_t next = 0;
    for (size_t i = 0; i < format.size(); ++i) {
        const wchar_t ch = format[i];
        if (ch != L'%') {
            out.push_back(ch);
            continue;
        }
        if (i + 1 < format.size() && format[i + 1] == L'%') {
            out.push_back(L'%');
            ++i;
            continue;
        }
        Directive directive;
        size_t j = i + 1;
        while (j < format.size() &&
               std::wstring_view(L"-+ #0").find(format[j]) != std::wstring_view::npos)
            directive.flags.push_back(static_cast<char>(format[j++]));
        auto readNumber = [&](int& target) {
            if (j < format.size() && format[j] == L'*') {
                target = next < count ? static_cast<int>(args[next++].asSigned()) : 0;
                ++j;
                return;
            }
            int v = -1;
            while (j < format.size() && format[j] >= L'0' && format[j] <= L'9')
                v = (v < 0 ? 0 : v) * 10 + (format[j++] - L'0');
            if (v > 256)
                v = 256;  // keeps a hostile template from asking for huge padding
            target = v;
        };
        readNumber(directive.width);
        if (j < format.size() && format[j] == L'.') {
            ++j;
            readNumber(directive.precision);
            if (directive.precision < 0)
                directive.precision = 0;
        }
        while (j < format.size() &&
               std::wstring_view(L"hlLqjzt").find(format[j]) != std::wstring_view::npos)
            ++j;
        if (j >= format.size()) {
            out.append(format.substr(i));
            break;
        }
        directive.conversion = format[j];
        const std::wstring_view conversions = L"scSCdiuxXofFeEgG";
        if (conversions.find(directive.conversion) == std::wstring_view::npos) {
            out.append(format.substr(i, j - i + 1));
            i = j;
            continue;
        }
        i = j;
        if (next >= count)
            continue;  // a missing argument formats as nothing
        const OxFormatArg& arg = args[next++];
        switch (directive.conversion) {
            case L's':
            case L'S': {
                std::wstring text = arg.asText();
                if (directive.precision >= 0 &&
                    text.size() > static_cast<size_t>(directive.precision))
                    text.resize(static_cast<size_t>(directive.precision));
                pad(out, text, directive);
                break;
            }
            case L'c':
            case L'C':
                pad(out, std::wstring(1, static_cast<wchar_t>(arg.asSigned())), directive);
                break;
            default:
                if (arg.kind() == OxFormatArg::Kind::WideText ||
                    arg.kind() == OxFormatArg::Kind::NarrowText)
                    pad(out, arg.asText(), directive);
                else
                    out += formatNumber(directive, arg);
                break;
        }
    }
    return out;
}
