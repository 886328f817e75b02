#include "platform/core/OxVariant.h"

#include <cstdlib>
#include <cstring>
#include <new>

struct OxVariant::Block {
    size_t size;  // elements, without the terminator of a text

    static Block* allocate(size_t size, size_t elementSize, size_t extra) {
        void* p = std::malloc(sizeof(Block) + (size + extra) * elementSize);
        if (!p)
            throw std::bad_alloc();
        auto* b = static_cast<Block*>(p);
        b->size = size;
        return b;
    }
    void* data() { return this + 1; }
    const void* data() const { return this + 1; }
};

namespace {
bool ownsBlock(uint16_t vt) {
    return vt == VT_BSTR || vt == (VT_ARRAY | VT_UI1);
}

template <class T>
uint64_t bitsOf(T v) {
    uint64_t bits = 0;
    std::memcpy(&bits, &v, sizeof v);
    return bits;
}
}  // namespace

OxVariant::OxVariant(const OxVariant& other) : m_lo(0) {
    copyFrom(other);
}

OxVariant::OxVariant(OxVariant&& other) noexcept
    : m_vt(other.m_vt),
      m_decScale(other.m_decScale),
      m_decSign(other.m_decSign),
      m_decHi32(other.m_decHi32),
      m_lo(other.m_lo) {
    other.m_vt = VT_EMPTY;
    other.m_lo = 0;
}

OxVariant& OxVariant::operator=(const OxVariant& other) {
    if (this != &other) {
        OxVariant copy(other);
        *this = std::move(copy);
    }
    return *this;
}

OxVariant& OxVariant::operator=(OxVariant&& other) noexcept {
    if (this != &other) {
        release();
        m_vt = other.m_vt;
        m_decScale = other.m_decScale;
        m_decSign = other.m_decSign;
        m_decHi32 = other.m_decHi32;
        m_lo = other.m_lo;
        other.m_vt = VT_EMPTY;
        other.m_lo = 0;
    }
    return *this;
}

void OxVariant::copyFrom(const OxVariant& other) {
    if (ownsBlock(other.m_vt)) {
        const Block* src = other.block();
        const bool text = other.m_vt == VT_BSTR;
        const size_t elem = text ? sizeof(wchar_t) : 1;
        Block* b = Block::allocate(src->size, elem, text ? 1 : 0);
        std::memcpy(b->data(), src->data(), (src->size + (text ? 1 : 0)) * elem);
        m_lo = reinterpret_cast<uint64_t>(b);
    } else {
        m_lo = other.m_lo;
    }
    m_vt = other.m_vt;
    m_decScale = other.m_decScale;
    m_decSign = other.m_decSign;
    m_decHi32 = other.m_decHi32;
}

void OxVariant::release() noexcept {
    if (ownsBlock(m_vt))
        std::free(block());
    m_lo = 0;
}

OxVariant::OxVariant(bool value) noexcept
    : m_vt(VT_BOOL), m_lo(static_cast<uint16_t>(value ? VARIANT_TRUE : VARIANT_FALSE)) {}
OxVariant::OxVariant(int16_t value) noexcept
    : m_vt(VT_I2), m_lo(static_cast<uint64_t>(static_cast<int64_t>(value))) {}
OxVariant::OxVariant(int32_t value) noexcept
    : m_vt(VT_I4), m_lo(static_cast<uint64_t>(static_cast<int64_t>(value))) {}
OxVariant::OxVariant(long value) noexcept : m_vt(VT_I8), m_lo(static_cast<uint64_t>(value)) {}
OxVariant::OxVariant(long long value) noexcept : m_vt(VT_I8), m_lo(static_cast<uint64_t>(value)) {}
OxVariant::OxVariant(uint8_t value) noexcept : m_vt(VT_UI1), m_lo(value) {}
OxVariant::OxVariant(uint32_t value) noexcept : m_vt(VT_UI4), m_lo(value) {}
OxVariant::OxVariant(unsigned long value) noexcept : m_vt(VT_UI8), m_lo(value) {}
OxVariant::OxVariant(float value) noexcept : m_vt(VT_R4), m_lo(bitsOf(value)) {}
OxVariant::OxVariant(double value) noexcept : m_vt(VT_R8), m_lo(bitsOf(value)) {}

OxVariant::OxVariant(const OxDateTime& value) noexcept
    : m_vt(value.getStatus() == OxDateTime::null ? VT_NULL : VT_DATE),
      m_lo(value.getStatus() == OxDateTime::null ? 0 : bitsOf(value.serial())) {}

OxVariant::OxVariant(const OxDecimal& value) noexcept
    : m_vt(VT_DECIMAL),
      m_decScale(value.scale),
      m_decSign(value.sign),
      m_decHi32(value.hi32),
      m_lo(value.lo64) {}

OxVariant::OxVariant(const wchar_t* text) : m_lo(0) {
    if (!text) {
        m_vt = VT_NULL;
        return;
    }
    *this = OxVariant(std::wstring_view(text));
}

OxVariant::OxVariant(std::wstring_view text) : m_vt(VT_BSTR) {
    Block* b = Block::allocate(text.size(), sizeof(wchar_t), 1);
    auto* chars = static_cast<wchar_t*>(b->data());
    if (!text.empty())
        std::memcpy(chars, text.data(), text.size() * sizeof(wchar_t));
    chars[text.size()] = L'\0';
    m_lo = reinterpret_cast<uint64_t>(b);
}

OxVariant OxVariant::null() noexcept {
    OxVariant v;
    v.m_vt = VT_NULL;
    return v;
}

OxVariant OxVariant::fromCurrency(int64_t scaled) noexcept {
    OxVariant v;
    v.m_vt = VT_CY;
    v.m_lo = static_cast<uint64_t>(scaled);
    return v;
}

OxVariant OxVariant::fromDate(double serial) noexcept {
    OxVariant v(serial);
    v.m_vt = VT_DATE;
    return v;
}

OxVariant OxVariant::fromError(int32_t scode) noexcept {
    OxVariant v(scode);
    v.m_vt = VT_ERROR;
    return v;
}

OxVariant OxVariant::fromBytes(const void* data, size_t size) {
    OxVariant v;
    Block* b = Block::allocate(size, 1, 0);
    if (size)
        std::memcpy(b->data(), data, size);
    v.m_vt = VT_ARRAY | VT_UI1;
    v.m_lo = reinterpret_cast<uint64_t>(b);
    return v;
}

OxVariant OxVariant::fromInteger(int64_t value) noexcept {
    if (value >= INT32_MIN && value <= INT32_MAX)
        return OxVariant(static_cast<int32_t>(value));
    return OxVariant(static_cast<long long>(value));
}

OxVariant OxVariant::fromInt(int32_t value) noexcept {
    OxVariant v(value);
    v.m_vt = VT_INT;
    return v;
}

float OxVariant::fltVal() const noexcept {
    float f;
    const uint32_t bits = static_cast<uint32_t>(m_lo);
    std::memcpy(&f, &bits, sizeof f);
    return f;
}

double OxVariant::dblVal() const noexcept {
    double d;
    std::memcpy(&d, &m_lo, sizeof d);
    return d;
}

OxDecimal OxVariant::decVal() const noexcept {
    return OxDecimal{m_decScale, m_decSign, m_decHi32, m_lo};
}

std::wstring_view OxVariant::bstr() const noexcept {
    if (m_vt != VT_BSTR)
        return {};
    const Block* b = block();
    return {static_cast<const wchar_t*>(b->data()), b->size};
}

const uint8_t* OxVariant::bytesData() const noexcept {
    return isByteArray() ? static_cast<const uint8_t*>(block()->data()) : nullptr;
}

size_t OxVariant::bytesSize() const noexcept {
    return isByteArray() ? block()->size : 0;
}

std::vector<uint8_t> OxVariant::bytes() const {
    const uint8_t* p = bytesData();
    return p ? std::vector<uint8_t>(p, p + bytesSize()) : std::vector<uint8_t>{};
}

void OxVariant::clear() noexcept {
    release();
    m_vt = VT_EMPTY;
    m_decScale = m_decSign = 0;
    m_decHi32 = 0;
}

void OxVariant::setNull() noexcept {
    clear();
    m_vt = VT_NULL;
}

bool OxVariant::operator==(const OxVariant& o) const noexcept {
    if (m_vt != o.m_vt)
        return false;
    switch (m_vt) {
        case VT_EMPTY:
        case VT_NULL:
            return true;
        case VT_BSTR:
            return bstr() == o.bstr();
        case VT_ARRAY | VT_UI1:
            return bytesSize() == o.bytesSize() &&
                   (bytesSize() == 0 || std::memcmp(bytesData(), o.bytesData(), bytesSize()) == 0);
        case VT_R4:
            return fltVal() == o.fltVal();
        case VT_R8:
        case VT_DATE:
            return dblVal() == o.dblVal();
        case VT_DECIMAL:
            return decVal() == o.decVal();
        case VT_BOOL:
        case VT_I2:
        case VT_UI2:
            return static_cast<uint16_t>(m_lo) == static_cast<uint16_t>(o.m_lo);
        case VT_I1:
        case VT_UI1:
            return static_cast<uint8_t>(m_lo) == static_cast<uint8_t>(o.m_lo);
        case VT_I4:
        case VT_UI4:
        case VT_INT:
        case VT_UINT:
        case VT_ERROR:
            return static_cast<uint32_t>(m_lo) == static_cast<uint32_t>(o.m_lo);
        default:
            return m_lo == o.m_lo;
    }
}
