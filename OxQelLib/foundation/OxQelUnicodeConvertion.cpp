#include "OxQelLib/foundation/OxQelUnicodeConvertion.h"

#include <cstring>

#include "platform/core/OxText.h"

OxQelUnicodeConvertion::OxQelUnicodeConvertion(const std::wstring& text) {
    const std::string utf8 = OxText::toUtf8(text);
    m_buffer = new char[utf8.size() + 1];
    std::memcpy(m_buffer, utf8.c_str(), utf8.size() + 1);
    m_size = utf8.size();
    m_owned = true;
}

OxQelUnicodeConvertion::OxQelUnicodeConvertion(const wchar_t* text) {
    if (!text)
        return;  // nothing to convert: the buffer stays null and unowned
    *this = OxQelUnicodeConvertion(std::wstring(text));
}

OxQelUnicodeConvertion::OxQelUnicodeConvertion(OxQelUnicodeConvertion&& other) noexcept
    : m_buffer(other.m_buffer), m_size(other.m_size), m_owned(other.m_owned) {
    other.m_buffer = nullptr;
    other.m_size = 0;
    other.m_owned = false;
}

OxQelUnicodeConvertion& OxQelUnicodeConvertion::operator=(OxQelUnicodeConvertion&& other) noexcept {
    if (this != &other) {
        if (m_owned)
            delete[] m_buffer;
        m_buffer = other.m_buffer;
        m_size = other.m_size;
        m_owned = other.m_owned;
        other.m_buffer = nullptr;
        other.m_size = 0;
        other.m_owned = false;
    }
    return *this;
}

OxQelUnicodeConvertion::~OxQelUnicodeConvertion() {
    if (m_owned)
        delete[] m_buffer;
}
