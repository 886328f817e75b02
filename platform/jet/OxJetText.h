#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

// Turns stored text into wide strings: Jet 4 and later keep UTF-16 (optionally in the
// one-byte-per-character compressed form), Jet 3 keeps the file's code page. One decoder
// per cursor: the code-page conversion keeps state.
class OxJetText {
public:
    // codePage 0 means UTF-16 text (Jet 4 and later). Throws OxJetError for a code page
    // the system cannot convert.
    explicit OxJetText(uint16_t codePage);
    ~OxJetText();
    OxJetText(const OxJetText&) = delete;
    OxJetText& operator=(const OxJetText&) = delete;

    // Replaces out with the decoded text. Characters beyond the BMP stay whole (surrogate
    // pairs are joined); malformed input becomes U+FFFD.
    void decode(const uint8_t* data, size_t size, std::wstring& out);
    std::wstring decode(const uint8_t* data, size_t size) {
        std::wstring out;
        decode(data, size, out);
        return out;
    }
    // UTF-16LE text that is never compressed (names in table definitions and properties).
    static void decodeUtf16(const uint8_t* data, size_t size, std::wstring& out);

    uint16_t codePage() const { return m_codePage; }

private:
    void decodeCodePage(const uint8_t* data, size_t size, std::wstring& out);

    uint16_t m_codePage;
    bool m_singleByte = false;
    wchar_t m_table[256] = {};
    void* m_iconv = nullptr;  // multi-byte code pages
};
