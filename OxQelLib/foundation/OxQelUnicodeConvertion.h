#pragma once

#include <string>

#include "platform/core/OxExport.h"

// The UTF-8 form of one wide string, for the 8-bit boundaries of the engines. It owns
// its buffer alone: it moves, it does not copy.
class OX_EXPORT OxQelUnicodeConvertion {
public:
    explicit OxQelUnicodeConvertion(const std::wstring& text);
    explicit OxQelUnicodeConvertion(const wchar_t* text);
    OxQelUnicodeConvertion(OxQelUnicodeConvertion&& other) noexcept;
    OxQelUnicodeConvertion& operator=(OxQelUnicodeConvertion&& other) noexcept;
    OxQelUnicodeConvertion(const OxQelUnicodeConvertion&) = delete;
    OxQelUnicodeConvertion& operator=(const OxQelUnicodeConvertion&) = delete;
    ~OxQelUnicodeConvertion();

    // The null-terminated UTF-8 text; null when the conversion gave nothing.
    operator const char*() const { return m_buffer; }
    size_t size() const { return m_size; }  // bytes, without the terminator

private:
    char* m_buffer = nullptr;
    size_t m_size = 0;
    bool m_owned = false;
};
