#pragma once

#include <cstdint>
#include <string>
#include <string_view>

// 8-bit text of old workbooks (BIFF5 and earlier) in the code page the file names.
// Unknown pages fall back to Windows-1252, the default of those files.
class OxWorkbookCodepage {
public:
    explicit OxWorkbookCodepage(uint16_t codepage = 1252);
    ~OxWorkbookCodepage();
    OxWorkbookCodepage(const OxWorkbookCodepage&) = delete;
    OxWorkbookCodepage& operator=(const OxWorkbookCodepage&) = delete;

    void decode(std::string_view bytes, std::wstring& out) const;

private:
    void* m_iconv = nullptr;  // iconv_t, or none for Latin-1
};
