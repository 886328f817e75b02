#include "platform/jet/OxJetUsageMap.h"

#include <algorithm>

#include "platform/core/OxFormat.h"
#include "platform/jet/OxJetBytes.h"
#include "platform/jet/OxJetPageFile.h"

namespace {
constexpr uint8_t kInline = 0;
constexpr uint8_t kReference = 1;
constexpr uint8_t kMapPage = 0x05;

// Appends the set bits of a bitmap as page numbers from `first`; pages past the end of the
// file are counted, so that a reader notices what a truncated file lost.
void addBits(OxJetUsageMap::Pages& out, const uint8_t* bits, size_t size, uint64_t first,
             uint32_t pageCount) {
    for (size_t i = 0; i < size; ++i) {
        if (!bits[i])
            continue;
        for (int b = 0; b < 8; ++b)
            if (bits[i] & (1u << b)) {
                const uint64_t page = first + i * 8 + static_cast<uint64_t>(b);
                if (page >= pageCount)
                    ++out.pastEnd;
                else
                    out.pages.push_back(static_cast<uint32_t>(page));
            }
    }
}
}  // namespace

OxJetUsageMap::Pages OxJetUsageMap::pages(const OxJetPageFile& file, uint32_t pointer) {
    const uint32_t size = file.pageSize();
    std::vector<uint8_t> page(size);
    const uint32_t mapPage = pointer >> 8;
    file.read(mapPage, page.data());
    if (page[0] != 0x01)
        throw OxJetError(
            oxFormat(L"damaged file: the page map on page %u is not on a data page", mapPage));
    const OxJetPageFile::Row row = file.row(page.data(), pointer & 0xFF);
    if (row.size < 1)
        throw OxJetError(L"damaged file: an empty page map");
    const OxJetBytes::View map(page.data() + row.start, row.size);
    Pages out;
    const uint8_t type = map.u8(0, L"a page map");
    if (type == kInline) {
        const uint32_t start = map.u32(1, L"a page map");
        addBits(out, map.data() + 5, row.size > 5 ? row.size - 5 : 0, start, file.pageCount());
    } else if (type == kReference) {
        std::vector<uint8_t> bitmapPage(size);
        const uint64_t perPage = (size - 4) * 8ull;
        for (size_t at = 1, n = 0; at + 4 <= row.size; at += 4, ++n) {
            const uint32_t pg = OxJetBytes::u32(map.data() + at);
            if (pg == 0)
                continue;
            file.read(pg, bitmapPage.data());
            if (bitmapPage[0] != kMapPage)
                throw OxJetError(oxFormat(L"damaged file: page %u is no page map", pg));
            addBits(out, bitmapPage.data() + 4, size - 4, n * perPage, file.pageCount());
        }
    } else {
        throw OxJetError(oxFormat(L"damaged file: unknown page map type %u", type));
    }
    std::sort(out.pages.begin(), out.pages.end());
    out.pages.erase(std::unique(out.pages.begin(), out.pages.end()), out.pages.end());
    return out;
}
