#include "platform/workbook/OxCompoundFileWriter.h"

#include <cstring>
#include <vector>

#include "platform/core/OxText.h"

namespace {
constexpr uint32_t kSector = 512;
constexpr uint32_t kEnd = 0xFFFFFFFE;
constexpr uint32_t kFree = 0xFFFFFFFF;
constexpr uint32_t kFatSect = 0xFFFFFFFD;
constexpr uint32_t kDifSect = 0xFFFFFFFC;
constexpr uint32_t kNoStream = 0xFFFFFFFF;
constexpr uint32_t kMiniCutoff = 4096;

void set16(char* p, uint32_t v) {
    p[0] = static_cast<char>(v & 0xFF);
    p[1] = static_cast<char>((v >> 8) & 0xFF);
}
void set32(char* p, uint32_t v) {
    set16(p, v & 0xFFFF);
    set16(p + 2, v >> 16);
}

void dirEntry(char* e, const std::wstring& name, uint8_t type, uint32_t child, uint32_t start,
              uint32_t size) {
    std::memset(e, 0, 128);
    const std::u16string n = OxText::toUtf16(name);
    for (size_t i = 0; i < n.size() && i < 31; ++i) set16(e + 2 * i, n[i]);
    set16(e + 64, static_cast<uint32_t>((n.size() + 1) * 2));
    e[66] = static_cast<char>(type);
    e[67] = 1;  // black
    set32(e + 68, kNoStream);
    set32(e + 72, kNoStream);
    set32(e + 76, child);
    set32(e + 116, start);
    set32(e + 120, size);
}
}  // namespace

void OxCompoundFileWriter::write(OxWorkbookOutputFile& out, const std::wstring& streamName,
                                 uint64_t size, const std::function<void()>& produce) {
    if (size > 0xFFFFFFFFull - kSector)
        OxWorkbookError::raise(OxWorkbookError::Limit,
                               L"the workbook stream is too large for an .xls file (4 GB)");
    const bool mini = size < kMiniCutoff;
    // Sector layout: the stream (or the mini stream), [mini FAT], directory, FAT, DIFAT.
    const uint32_t miniSectors = mini ? static_cast<uint32_t>((size + 63) / 64) : 0;
    const uint32_t dataSectors = static_cast<uint32_t>(
        mini ? (miniSectors * 64ull + kSector - 1) / kSector : (size + kSector - 1) / kSector);
    const uint32_t miniFatSectors = mini ? 1 : 0;
    const uint32_t dirSector = dataSectors + miniFatSectors;
    uint32_t fat = 1, difat = 0;
    for (;;) {
        const uint64_t total = dirSector + 1ull + fat + difat;
        const uint32_t needFat = static_cast<uint32_t>((total + 127) / 128);
        const uint32_t needDifat = needFat > 109 ? (needFat - 109 + 126) / 127 : 0;
        if (needFat == fat && needDifat == difat)
            break;
        fat = needFat;
        difat = needDifat;
    }
    const uint32_t fatStart = dirSector + 1;
    const uint32_t difatStart = fatStart + fat;

    std::vector<char> header(kSector, 0);
    static const unsigned char kSignature[] = {0xD0, 0xCF, 0x11, 0xE0, 0xA1, 0xB1, 0x1A, 0xE1};
    std::memcpy(header.data(), kSignature, 8);
    set16(&header[0x18], 0x003E);
    set16(&header[0x1A], 3);
    set16(&header[0x1C], 0xFFFE);
    set16(&header[0x1E], 9);
    set16(&header[0x20], 6);
    set32(&header[0x2C], fat);
    set32(&header[0x30], dirSector);
    set32(&header[0x38], kMiniCutoff);
    set32(&header[0x3C], mini ? dataSectors : kEnd);
    set32(&header[0x40], miniFatSectors);
    set32(&header[0x44], difat ? difatStart : kEnd);
    set32(&header[0x48], difat);
    for (uint32_t i = 0; i < 109; ++i) set32(&header[0x4C + 4 * i], i < fat ? fatStart + i : kFree);
    out.write(header.data(), header.size());

    const uint64_t before = out.position();
    produce();
    if (out.position() - before != size)
        OxWorkbookError::raise(OxWorkbookError::Limit, L"the workbook stream changed its size");
    const uint64_t padded = static_cast<uint64_t>(dataSectors) * kSector;
    std::vector<char> zeros(kSector, 0);
    for (uint64_t left = padded - size; left > 0;) {
        const size_t n = left > kSector ? kSector : static_cast<size_t>(left);
        out.write(zeros.data(), n);
        left -= n;
    }

    std::vector<char> sector(kSector, 0);
    if (mini) {
        std::memset(sector.data(), 0xFF, kSector);
        for (uint32_t i = 0; i < miniSectors; ++i)
            set32(&sector[4 * i], i + 1 < miniSectors ? i + 1 : kEnd);
        out.write(sector.data(), kSector);
    }

    std::memset(sector.data(), 0, kSector);
    const uint32_t rootStart = mini && miniSectors ? 0 : kEnd;
    dirEntry(&sector[0], L"Root Entry", 5, 1, rootStart, mini ? miniSectors * 64 : 0);
    dirEntry(&sector[128], streamName, 2, kNoStream, mini ? (size ? 0 : kEnd) : 0,
             static_cast<uint32_t>(size));
    for (int i = 2; i < 4; ++i) {
        char* e = &sector[128 * i];
        set32(e + 68, kNoStream);
        set32(e + 72, kNoStream);
        set32(e + 76, kNoStream);
    }
    out.write(sector.data(), kSector);

    // The allocation table: each data run chains to its next sector.
    std::vector<uint32_t> table(static_cast<size_t>(fat) * 128, kFree);
    for (uint32_t i = 0; i < dataSectors; ++i) table[i] = i + 1 < dataSectors ? i + 1 : kEnd;
    if (mini)
        table[dataSectors] = kEnd;
    table[dirSector] = kEnd;
    for (uint32_t i = 0; i < fat; ++i) table[fatStart + i] = kFatSect;
    for (uint32_t i = 0; i < difat; ++i) table[difatStart + i] = kDifSect;
    std::vector<char> bytes(table.size() * 4);
    for (size_t i = 0; i < table.size(); ++i) set32(&bytes[4 * i], table[i]);
    out.write(bytes.data(), bytes.size());

    for (uint32_t d = 0; d < difat; ++d) {
        std::memset(sector.data(), 0xFF, kSector);
        for (uint32_t i = 0; i < 127; ++i) {
            const uint32_t k = 109 + d * 127 + i;
            if (k < fat)
                set32(&sector[4 * i], fatStart + k);
        }
        set32(&sector[508], d + 1 < difat ? difatStart + d + 1 : kEnd);
        out.write(sector.data(), kSector);
    }
}
