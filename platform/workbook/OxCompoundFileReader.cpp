#include "platform/workbook/OxCompoundFileReader.h"

#include <cstring>

#include "platform/core/OxFormat.h"
#include "platform/core/OxText.h"

namespace {
constexpr uint32_t kEndOfChain = 0xFFFFFFFE;
constexpr uint32_t kFree = 0xFFFFFFFF;
constexpr uint32_t kNoStream = 0xFFFFFFFF;

uint16_t u16(const char* p) {
    return static_cast<uint16_t>(static_cast<uint8_t>(p[0]) | static_cast<uint8_t>(p[1]) << 8);
}
uint32_t u32(const char* p) {
    return static_cast<uint32_t>(u16(p)) | static_cast<uint32_t>(u16(p + 2)) << 16;
}

OxWorkbookError corrupt(const wchar_t* what) {
    return OxWorkbookError(OxWorkbookError::Corrupt, oxFormat(L"damaged compound file: %s", what));
}
}  // namespace

bool OxCompoundFileReader::readSector(uint32_t sector, char* out, OxWorkbookError& error) const {
    if (sector >= m_sectorCount) {
        error = corrupt(L"a sector lies past the end of the file (truncated?)");
        return false;
    }
    const uint64_t offset = (static_cast<uint64_t>(sector) + 1) * m_sectorSize;
    const uint64_t avail = m_source->size() - offset;
    const size_t len = avail < m_sectorSize ? static_cast<size_t>(avail) : m_sectorSize;
    // A short last sector is padded: some writers do not fill it.
    if (len < m_sectorSize)
        std::memset(out + len, 0, m_sectorSize - len);
    if (!m_source->read(offset, out, len)) {
        error = OxWorkbookError(OxWorkbookError::Io, L"cannot read the compound file");
        return false;
    }
    return true;
}

bool OxCompoundFileReader::chain(const std::vector<uint32_t>& table, uint32_t start, uint64_t limit,
                                 std::vector<uint32_t>& out, OxWorkbookError& error) const {
    out.clear();
    uint32_t s = start;
    while (s != kEndOfChain) {
        if (s >= table.size() || out.size() >= limit) {
            error = corrupt(s >= table.size() ? L"a sector chain leaves the allocation table"
                                              : L"a sector chain loops");
            return false;
        }
        out.push_back(s);
        s = table[s];
    }
    return true;
}

bool OxCompoundFileReader::readChain(uint32_t start, std::string& out,
                                     OxWorkbookError& error) const {
    std::vector<uint32_t> sectors;
    if (start == kEndOfChain || start == kFree) {
        out.clear();
        return true;
    }
    if (!chain(m_fat, start, m_sectorCount, sectors, error))
        return false;
    out.resize(sectors.size() * static_cast<size_t>(m_sectorSize));
    // Neighbouring sectors are read in one call: streams are mostly contiguous.
    for (size_t i = 0; i < sectors.size();) {
        size_t j = i + 1;
        while (j < sectors.size() && sectors[j] == sectors[j - 1] + 1) ++j;
        const uint32_t first = sectors[i];
        const uint32_t last = sectors[j - 1];
        if (last >= m_sectorCount) {
            error = corrupt(L"a sector lies past the end of the file (truncated?)");
            return false;
        }
        const uint64_t offset = (static_cast<uint64_t>(first) + 1) * m_sectorSize;
        const uint64_t want = static_cast<uint64_t>(j - i) * m_sectorSize;
        const uint64_t avail = m_source->size() - offset;
        const size_t len = static_cast<size_t>(avail < want ? avail : want);
        char* dst = out.data() + i * m_sectorSize;
        if (!m_source->read(offset, dst, len)) {
            error = OxWorkbookError(OxWorkbookError::Io, L"cannot read the compound file");
            return false;
        }
        if (len < want)
            std::memset(dst + len, 0, static_cast<size_t>(want - len));
        i = j;
    }
    return true;
}

bool OxCompoundFileReader::open(const OxWorkbookSource& source, OxWorkbookError& error) {
    m_source = &source;
    char h[512];
    static const unsigned char kSignature[] = {0xD0, 0xCF, 0x11, 0xE0, 0xA1, 0xB1, 0x1A, 0xE1};
    if (!source.read(0, h, sizeof h) || std::memcmp(h, kSignature, 8) != 0) {
        error = corrupt(L"no compound file header");
        return false;
    }
    const uint16_t shift = u16(h + 0x1E);
    const uint16_t miniShift = u16(h + 0x20);
    if ((shift != 9 && shift != 12) || miniShift != 6) {
        error = corrupt(L"unknown sector size");
        return false;
    }
    m_sectorSize = 1u << shift;
    m_sectorCount = (source.size() + m_sectorSize - 1) / m_sectorSize - 1;
    const uint32_t fatCount = u32(h + 0x2C);
    const uint32_t firstDir = u32(h + 0x30);
    const uint32_t cutoff = u32(h + 0x38);
    m_miniCutoff = cutoff == 0 ? 4096 : cutoff;
    const uint32_t firstMiniFat = u32(h + 0x3C);
    uint32_t difat = u32(h + 0x44);
    const uint32_t perSector = m_sectorSize / 4;
    if (fatCount > m_sectorCount) {
        error = corrupt(L"more allocation sectors than the file holds");
        return false;
    }

    // The allocation table's own sectors: 109 in the header, the rest in DIFAT sectors.
    std::vector<uint32_t> fatSectors;
    for (uint32_t i = 0; i < 109 && fatSectors.size() < fatCount; ++i)
        fatSectors.push_back(u32(h + 0x4C + 4 * i));
    std::string buf(m_sectorSize, '\0');
    uint64_t guard = 0;
    while (fatSectors.size() < fatCount && difat != kEndOfChain && difat != kFree) {
        if (++guard > m_sectorCount || !readSector(difat, buf.data(), error)) {
            if (!error)
                error = corrupt(L"the DIFAT chain loops");
            return false;
        }
        for (uint32_t i = 0; i + 1 < perSector && fatSectors.size() < fatCount; ++i)
            fatSectors.push_back(u32(buf.data() + 4 * i));
        difat = u32(buf.data() + 4 * (perSector - 1));
    }
    m_fat.clear();
    m_fat.reserve(fatSectors.size() * perSector);
    for (uint32_t s : fatSectors) {
        if (!readSector(s, buf.data(), error))
            return false;
        for (uint32_t i = 0; i < perSector; ++i) m_fat.push_back(u32(buf.data() + 4 * i));
    }
    // Entries past the file's end can never be read; dropping them bounds every chain.
    if (m_fat.size() > m_sectorCount)
        m_fat.resize(static_cast<size_t>(m_sectorCount));

    std::string dir;
    if (!readChain(firstDir, dir, error))
        return false;
    const size_t entryCount = dir.size() / 128;
    m_entries.assign(entryCount, Entry{});
    for (size_t i = 0; i < entryCount; ++i) {
        const char* e = dir.data() + i * 128;
        Entry& en = m_entries[i];
        const uint16_t nameBytes = u16(e + 64);
        std::u16string name;
        for (uint16_t k = 0; k + 1 < nameBytes && k < 64; k += 2) {
            const char16_t c = u16(e + k);
            if (c == 0)
                break;
            name.push_back(c);
        }
        en.name = OxText::fromUtf16(name);
        en.type = static_cast<uint8_t>(e[66]);
        en.left = u32(e + 68);
        en.right = u32(e + 72);
        en.child = u32(e + 76);
        en.start = u32(e + 116);
        en.size =
            shift == 9 ? u32(e + 120) : (static_cast<uint64_t>(u32(e + 124)) << 32 | u32(e + 120));
    }
    if (m_entries.empty() || m_entries[0].type != 5) {
        error = corrupt(L"no root storage");
        return false;
    }

    // The mini stream holds the small streams, in 64-byte sectors.
    if (!readChain(m_entries[0].start, m_miniStream, error))
        return false;
    if (m_miniStream.size() > m_entries[0].size)
        m_miniStream.resize(static_cast<size_t>(m_entries[0].size));
    std::string miniFat;
    if (!readChain(firstMiniFat, miniFat, error))
        return false;
    m_miniFat.resize(miniFat.size() / 4);
    for (size_t i = 0; i < m_miniFat.size(); ++i) m_miniFat[i] = u32(miniFat.data() + 4 * i);

    // The root's children form a tree through left/right links; walk it once.
    m_rootStreams.clear();
    m_rootStreamNames.clear();
    std::vector<uint32_t> stack{m_entries[0].child};
    std::vector<bool> seen(entryCount, false);
    while (!stack.empty()) {
        const uint32_t id = stack.back();
        stack.pop_back();
        if (id == kNoStream || id >= entryCount || seen[id])
            continue;
        seen[id] = true;
        const Entry& en = m_entries[id];
        if (en.type == 2) {
            m_rootStreams.push_back(id);
            m_rootStreamNames.push_back(en.name);
        }
        stack.push_back(en.left);
        stack.push_back(en.right);
    }
    return true;
}

int OxCompoundFileReader::findRootStream(const std::wstring& name) const {
    for (size_t i = 0; i < m_rootStreams.size(); ++i)
        if (OxText::equalsNoCase(m_rootStreamNames[i], name))
            return static_cast<int>(m_rootStreams[i]);
    return -1;
}

bool OxCompoundFileReader::hasRootStream(const std::wstring& name) const {
    return findRootStream(name) >= 0;
}

bool OxCompoundFileReader::readRootStream(const std::wstring& name, std::string& out,
                                          OxWorkbookError& error) const {
    const int id = findRootStream(name);
    if (id < 0) {
        error = OxWorkbookError(OxWorkbookError::Corrupt,
                                oxFormat(L"the compound file has no stream %s", name));
        return false;
    }
    return readEntry(m_entries[static_cast<size_t>(id)], out, error);
}

bool OxCompoundFileReader::readEntry(const Entry& entry, std::string& out,
                                     OxWorkbookError& error) const {
    if (entry.size >= m_miniCutoff) {
        if (!readChain(entry.start, out, error))
            return false;
    } else {
        std::vector<uint32_t> sectors;
        if (entry.size > 0 &&
            !chain(m_miniFat, entry.start, m_miniStream.size() / 64 + 1, sectors, error))
            return false;
        out.assign(sectors.size() * 64, '\0');
        for (size_t i = 0; i < sectors.size(); ++i) {
            const uint64_t off = static_cast<uint64_t>(sectors[i]) * 64;
            if (off + 64 > m_miniStream.size()) {
                error = corrupt(L"a small stream lies past the end of the mini stream");
                return false;
            }
            std::memcpy(out.data() + i * 64, m_miniStream.data() + off, 64);
        }
    }
    if (out.size() < entry.size) {
        error = corrupt(L"a stream is shorter than its directory entry says");
        return false;
    }
    out.resize(static_cast<size_t>(entry.size));
    return true;
}
