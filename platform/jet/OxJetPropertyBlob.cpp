#include "platform/jet/OxJetPropertyBlob.h"

#include <cstring>

#include "platform/core/OxFormat.h"
#include "platform/jet/OxJetBytes.h"
#include "platform/jet/OxJetText.h"
#include "platform/jet/OxJetValue.h"

namespace {
constexpr uint16_t kNamesBlock = 0x80;

std::wstring valueText(uint8_t type, const uint8_t* p, size_t size, OxJetText& text) {
    switch (static_cast<OxJetType>(type)) {
        case OxJetType::Text:
        case OxJetType::Memo:
            return text.decode(p, size);
        case OxJetType::Boolean:
            return size >= 1 && p[0] ? L"True" : L"False";
        case OxJetType::ReplicationId:
            if (size == 16)
                return OxJetValue::guidText(p);
            break;
        case OxJetType::DateTime:
        case OxJetType::Double:
            if (size == 8) {
                OxJetValue v;
                v.kind = type == 8 ? OxJetValue::DateTime : OxJetValue::Double;
                v.real = OxJetBytes::f64(p);
                return v.toText();
            }
            break;
        default:
            break;
    }
    // Whole numbers by their stored width; anything else as hex.
    if (size == 1)
        return std::to_wstring(p[0]);
    if (size == 2)
        return std::to_wstring(static_cast<int16_t>(OxJetBytes::u16(p)));
    if (size == 4)
        return std::to_wstring(static_cast<int32_t>(OxJetBytes::u32(p)));
    std::wstring hex;
    OxJetValue::appendHex(hex, p, size);
    return hex;
}
}  // namespace

std::vector<OxJetPropertyBlob::Block> OxJetPropertyBlob::parse(const std::vector<uint8_t>& blob,
                                                               bool jet3, uint16_t codePage) {
    std::vector<Block> blocks;
    if (blob.empty())
        return blocks;
    if (blob.size() < 4 ||
        (std::memcmp(blob.data(), "MR2", 4) != 0 && std::memcmp(blob.data(), "KKD", 4) != 0))
        throw OxJetError(L"damaged file: a property block has an unknown signature");
    OxJetText text(jet3 ? codePage : 0);
    const OxJetBytes::View all(blob.data(), blob.size());
    std::vector<std::wstring> names;
    std::wstring scratch;
    auto readName = [&](size_t& pos, size_t end) {
        const uint16_t len = all.u16(pos, L"a property name");
        if (pos + 2 + len > end)
            throw OxJetError(L"damaged file: a property name runs past its block");
        const uint8_t* p = all.at(pos + 2, len, L"a property name");
        if (jet3)
            text.decode(p, len, scratch);
        else
            OxJetText::decodeUtf16(p, len, scratch);
        pos += 2 + len;
        return scratch;
    };
    size_t pos = 4;
    while (pos < blob.size()) {
        const uint32_t blockSize = all.u32(pos, L"a property block");
        const uint16_t type = all.u16(pos + 4, L"a property block");
        if (blockSize < 6 || blockSize > blob.size() - pos)
            throw OxJetError(L"damaged file: a property block has a bad length");
        const size_t end = pos + blockSize;
        size_t p = pos + 6;
        if (type == kNamesBlock) {
            while (p < end) names.push_back(readName(p, end));
        } else {
            Block block;
            block.isColumn = type == 1;
            const size_t nameStart = p;
            const uint32_t nameBlock = all.u32(p, L"a property block name");
            if (nameBlock < 4 || nameBlock > end - nameStart)
                throw OxJetError(L"damaged file: a property block name has a bad length");
            p += 4;
            if (nameBlock >= 6)
                block.objectName = readName(p, nameStart + nameBlock);
            p = nameStart + nameBlock;
            while (p + 8 <= end) {
                const uint16_t len = all.u16(p, L"a property");
                const uint8_t dataType = all.u8(p + 3, L"a property");
                const uint16_t nameIndex = all.u16(p + 4, L"a property");
                const uint16_t dataSize = all.u16(p + 6, L"a property");
                if (len < 8 || len > end - p || dataSize > len - 8)
                    throw OxJetError(L"damaged file: a property has a bad length");
                if (nameIndex >= names.size())
                    throw OxJetError(L"damaged file: a property refers to an unknown name");
                block.values.emplace_back(
                    names[nameIndex],
                    valueText(dataType, all.at(p + 8, dataSize, L"a property"), dataSize, text));
                p += len;
            }
            blocks.push_back(std::move(block));
        }
        pos = end;
    }
    return blocks;
}
