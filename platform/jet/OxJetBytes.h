#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>

#include "platform/jet/OxJetError.h"

// Little-endian reads from a buffer whose size the caller checked; the checked variants
// throw OxJetError when the field runs past the end.
namespace OxJetBytes {
inline uint8_t u8(const uint8_t* p) {
    return p[0];
}
inline uint16_t u16(const uint8_t* p) {
    return static_cast<uint16_t>(p[0] | (p[1] << 8));
}
inline uint32_t u24(const uint8_t* p) {
    return static_cast<uint32_t>(p[0] | (p[1] << 8) | (p[2] << 16));
}
inline uint32_t u32(const uint8_t* p) {
    uint32_t v;
    std::memcpy(&v, p, 4);
    return v;
}
inline uint64_t u64(const uint8_t* p) {
    uint64_t v;
    std::memcpy(&v, p, 8);
    return v;
}
inline double f64(const uint8_t* p) {
    double v;
    std::memcpy(&v, p, 8);
    return v;
}
inline float f32(const uint8_t* p) {
    float v;
    std::memcpy(&v, p, 4);
    return v;
}

// A bounded view: every read names its offset and fails cleanly past the end.
class View {
public:
    View(const uint8_t* data, size_t size) : m_data(data), m_size(size) {}
    size_t size() const { return m_size; }
    const uint8_t* data() const { return m_data; }
    bool has(size_t offset, size_t length) const {
        return offset <= m_size && length <= m_size - offset;
    }
    const uint8_t* at(size_t offset, size_t length, const wchar_t* what) const {
        if (!has(offset, length))
            throw OxJetError(std::wstring(L"damaged file: ") + what + L" lies outside its page");
        return m_data + offset;
    }
    uint8_t u8(size_t offset, const wchar_t* what) const { return *at(offset, 1, what); }
    uint16_t u16(size_t offset, const wchar_t* what) const {
        return OxJetBytes::u16(at(offset, 2, what));
    }
    uint32_t u32(size_t offset, const wchar_t* what) const {
        return OxJetBytes::u32(at(offset, 4, what));
    }

private:
    const uint8_t* m_data;
    size_t m_size;
};
}  // namespace OxJetBytes
