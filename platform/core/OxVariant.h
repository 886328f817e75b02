#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "platform/core/OxComError.h"
#include "platform/core/OxDateTime.h"
#include "platform/core/OxExport.h"

// Type tags of the automation variant, with the numbers Windows gives them.
enum OxVarType : uint16_t {
    VT_EMPTY = 0,
    VT_NULL = 1,
    VT_I2 = 2,
    VT_I4 = 3,
    VT_R4 = 4,
    VT_R8 = 5,
    VT_CY = 6,
    VT_DATE = 7,
    VT_BSTR = 8,
    VT_ERROR = 10,
    VT_BOOL = 11,
    VT_DECIMAL = 14,
    VT_I1 = 16,
    VT_UI1 = 17,
    VT_UI2 = 18,
    VT_UI4 = 19,
    VT_I8 = 20,
    VT_UI8 = 21,
    VT_INT = 22,
    VT_UINT = 23,
    VT_ARRAY = 0x2000,
};

constexpr int16_t VARIANT_TRUE = -1;
constexpr int16_t VARIANT_FALSE = 0;

// A 96-bit scaled decimal as the platform keeps it: value = (hi32:lo64) / 10^scale,
// negative when sign is 0x80.
struct OxDecimal {
    uint8_t scale = 0;
    uint8_t sign = 0;
    uint32_t hi32 = 0;
    uint64_t lo64 = 0;

    static constexpr uint8_t kNegative = 0x80;
    bool operator==(const OxDecimal&) const = default;
};

// The automation variant: a type tag and a value in 16 bytes, like the Windows VARIANT.
// Text (VT_BSTR) and byte arrays (VT_ARRAY | VT_UI1) live on the heap, owned by the
// variant and copied with it. changeType follows the platform's conversion rules, with
// the user locale (OxUserLocale) for separators and dates, and throws OxComError when a
// conversion fails.
class OX_EXPORT OxVariant {
public:
    OxVariant() noexcept { m_lo = 0; }
    OxVariant(const OxVariant& other);
    OxVariant(OxVariant&& other) noexcept;
    OxVariant& operator=(const OxVariant& other);
    OxVariant& operator=(OxVariant&& other) noexcept;
    ~OxVariant() { release(); }

    // Explicit: a pointer must never become a boolean variant unnoticed.
    explicit OxVariant(bool value) noexcept;      // VT_BOOL
    OxVariant(int16_t value) noexcept;            // VT_I2
    OxVariant(int32_t value) noexcept;            // VT_I4
    OxVariant(long value) noexcept;               // VT_I8 (long is 64 bits here)
    OxVariant(long long value) noexcept;          // VT_I8
    OxVariant(uint8_t value) noexcept;            // VT_UI1
    OxVariant(uint32_t value) noexcept;           // VT_UI4
    OxVariant(unsigned long value) noexcept;      // VT_UI8
    OxVariant(float value) noexcept;              // VT_R4
    OxVariant(double value) noexcept;             // VT_R8
    OxVariant(const OxDateTime& value) noexcept;  // VT_DATE (VT_NULL for a null date)
    OxVariant(const OxDecimal& value) noexcept;   // VT_DECIMAL
    explicit OxVariant(const wchar_t* text);      // VT_BSTR (VT_NULL for a null pointer)
    explicit OxVariant(std::wstring_view text);   // VT_BSTR
    OxVariant(const std::wstring& text) : OxVariant(std::wstring_view(text)) {}
    OxVariant(const char*) = delete;  // 8-bit text would silently become a boolean

    static OxVariant null() noexcept;
    static OxVariant fromCurrency(int64_t scaledBy10000) noexcept;  // VT_CY
    static OxVariant fromDate(double serial) noexcept;              // VT_DATE
    static OxVariant fromError(int32_t scode) noexcept;             // VT_ERROR
    static OxVariant fromBytes(const void* data, size_t size);      // VT_ARRAY | VT_UI1
    static OxVariant fromBytes(const std::vector<uint8_t>& bytes) {
        return fromBytes(bytes.data(), bytes.size());
    }
    // The smallest of VT_I4 / VT_I8 that holds the value.
    static OxVariant fromInteger(int64_t value) noexcept;
    static OxVariant fromInt(int32_t value) noexcept;  // VT_INT

    uint16_t vt() const noexcept { return m_vt; }
    bool isEmpty() const noexcept { return m_vt == VT_EMPTY; }
    bool isNull() const noexcept { return m_vt == VT_NULL; }
    bool isByteArray() const noexcept { return m_vt == (VT_ARRAY | VT_UI1); }

    // Raw members, valid for the matching tag (as the union fields of the platform).
    int16_t iVal() const noexcept { return static_cast<int16_t>(m_lo); }
    int16_t boolVal() const noexcept { return static_cast<int16_t>(m_lo); }
    int32_t lVal() const noexcept { return static_cast<int32_t>(m_lo); }
    int32_t scode() const noexcept { return static_cast<int32_t>(m_lo); }
    int64_t llVal() const noexcept { return static_cast<int64_t>(m_lo); }
    uint64_t ullVal() const noexcept { return m_lo; }
    uint32_t ulVal() const noexcept { return static_cast<uint32_t>(m_lo); }
    uint8_t bVal() const noexcept { return static_cast<uint8_t>(m_lo); }
    int8_t cVal() const noexcept { return static_cast<int8_t>(m_lo); }
    uint16_t uiVal() const noexcept { return static_cast<uint16_t>(m_lo); }
    float fltVal() const noexcept;
    double dblVal() const noexcept;
    double date() const noexcept { return dblVal(); }
    int64_t cyVal() const noexcept { return llVal(); }
    OxDecimal decVal() const noexcept;

    // VT_BSTR content (empty for other tags).
    std::wstring_view bstr() const noexcept;
    std::wstring str() const { return std::wstring(bstr()); }
    // VT_ARRAY | VT_UI1 content (empty for other tags).
    const uint8_t* bytesData() const noexcept;
    size_t bytesSize() const noexcept;
    std::vector<uint8_t> bytes() const;

    void clear() noexcept;  // back to VT_EMPTY
    void setNull() noexcept;

    // Changes the variant in place to the type; throws OxComError (DISP_E_TYPEMISMATCH,
    // DISP_E_OVERFLOW, DISP_E_BADVARTYPE) and leaves the variant unchanged on failure.
    void changeType(uint16_t vt);
    // The converted copy; the same rules.
    OxVariant changedType(uint16_t vt) const;
    // The converted copy into hr's out value, without throwing.
    OxHResult tryChangeType(uint16_t vt, OxVariant& out) const noexcept;

    // Same tag and same value (texts and bytes compared by content).
    bool operator==(const OxVariant& other) const noexcept;

private:
    struct Block;  // heap storage of a text or byte array: size, then the elements
    Block* block() const noexcept { return reinterpret_cast<Block*>(m_lo); }
    void release() noexcept;
    void copyFrom(const OxVariant& other);

    // Laid out as the platform's VARIANT: the tag, then the decimal's scale, sign and
    // high word where other types keep padding, then eight bytes of value.
    uint16_t m_vt = VT_EMPTY;
    uint8_t m_decScale = 0;
    uint8_t m_decSign = 0;
    uint32_t m_decHi32 = 0;
    uint64_t m_lo;
};

static_assert(sizeof(OxVariant) == 16, "the variant keeps the platform's size");
