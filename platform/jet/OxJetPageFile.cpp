#include "platform/jet/OxJetPageFile.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cmath>
#include <cstring>

#include "platform/core/OxFormat.h"
#include "platform/jet/OxJetBytes.h"

namespace {
// The first page's settings are masked with a fixed key; encoded files scramble every
// other page with the file's own key mixed with the page number.
constexpr uint32_t kHeaderKey = 0x6b39dac7;

void rc4(uint32_t key, uint8_t* data, size_t size) {
    uint8_t s[256];
    uint8_t k[4];
    std::memcpy(k, &key, 4);
    for (int i = 0; i < 256; ++i) s[i] = static_cast<uint8_t>(i);
    uint8_t j = 0;
    for (int i = 0; i < 256; ++i) {
        j = static_cast<uint8_t>(j + s[i] + k[i % 4]);
        std::swap(s[i], s[j]);
    }
    uint8_t a = 0, b = 0;
    for (size_t n = 0; n < size; ++n) {
        a = static_cast<uint8_t>(a + 1);
        b = static_cast<uint8_t>(b + s[a]);
        std::swap(s[a], s[b]);
        data[n] ^= s[static_cast<uint8_t>(s[a] + s[b])];
    }
}

std::wstring errnoText() {
    return OxText::fromUtf8(std::strerror(errno));
}
}  // namespace

std::shared_ptr<OxJetPageFile> OxJetPageFile::openFile(const std::string& path) {
    std::shared_ptr<OxJetPageFile> file(new OxJetPageFile());
    file->m_fd = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
    if (file->m_fd < 0)
        throw OxJetError(oxFormat(L"cannot open %s: %s", path, errnoText()));
    struct stat st {};
    if (::fstat(file->m_fd, &st) != 0)
        throw OxJetError(oxFormat(L"cannot read %s: %s", path, errnoText()));
    if (!S_ISREG(st.st_mode))
        throw OxJetError(oxFormat(L"%s is not a regular file", path));
    file->m_fileSize = static_cast<uint64_t>(st.st_size);
    file->readHeader();
    return file;
}

std::shared_ptr<OxJetPageFile> OxJetPageFile::openBuffer(std::vector<uint8_t> bytes) {
    std::shared_ptr<OxJetPageFile> file(new OxJetPageFile());
    file->m_memory = std::move(bytes);
    file->m_fileSize = file->m_memory.size();
    file->readHeader();
    return file;
}

OxJetPageFile::~OxJetPageFile() {
    if (m_fd >= 0)
        ::close(m_fd);
}

void OxJetPageFile::readHeader() {
    static const char kMagicJet[] = "Standard Jet DB";
    static const char kMagicAce[] = "Standard ACE DB";
    uint8_t h[2048] = {};
    if (m_fileSize < sizeof h)
        throw OxJetError(L"not an Access database: the file is too short");
    m_header.pageSize = sizeof h;  // enough to read the first page's start
    m_pageCount = 1;
    readRaw(0, h);
    const bool jet = std::memcmp(h + 4, kMagicJet, 15) == 0;
    const bool ace = std::memcmp(h + 4, kMagicAce, 15) == 0;
    if (h[0] != 0 || h[1] != 1 || (!jet && !ace))
        throw OxJetError(L"not an Access database");
    static const OxJetFormat kFormats[] = {
        OxJetFormat::Jet3,  OxJetFormat::Jet4,  OxJetFormat::Ace12, OxJetFormat::Ace14,
        OxJetFormat::Ace15, OxJetFormat::Ace16, OxJetFormat::Ace17};
    const uint8_t version = h[0x14];
    if (version >= std::size(kFormats))
        throw OxJetError(oxFormat(L"unknown Access file version %u", version));
    m_header.format = kFormats[version];
    const bool jet3 = m_header.format == OxJetFormat::Jet3;
    m_header.pageSize = jet3 ? 2048 : 4096;

    rc4(kHeaderKey, h + 0x18, jet3 ? 126 : 128);
    m_header.codePage = OxJetBytes::u16(h + 0x3C);
    m_header.pageKey = OxJetBytes::u32(h + 0x3E);
    m_header.sortOrder = jet3 ? OxJetBytes::u16(h + 0x3A) : OxJetBytes::u32(h + 0x6E);
    if (jet3) {
        for (int i = 0; i < 20 && h[0x42 + i]; ++i)
            m_header.password.push_back(static_cast<wchar_t>(h[0x42 + i]));
    } else {
        // The password is further masked with the creation date's whole days.
        m_header.created = OxJetBytes::f64(h + 0x72);
        uint8_t mask[4] = {};
        if (std::isfinite(m_header.created) && std::fabs(m_header.created) < 2147483647.0) {
            const int32_t days = static_cast<int32_t>(m_header.created);
            std::memcpy(mask, &days, 4);
        }
        std::u16string pw;
        for (int i = 0; i < 20; ++i) {
            const char16_t c =
                static_cast<char16_t>((h[0x42 + 2 * i] ^ mask[(2 * i) % 4]) |
                                      (h[0x43 + 2 * i] ^ mask[(2 * i + 1) % 4]) << 8);
            if (c == 0)
                break;
            pw.push_back(c);
        }
        m_header.password = OxText::fromUtf16(pw);
    }
    if (!jet3 && m_header.format != OxJetFormat::Jet4 && m_header.pageKey != 0)
        throw OxJetError(L"the database is encrypted; encrypted .accdb files cannot be read");
    m_pageCount =
        static_cast<uint32_t>(std::min<uint64_t>(m_fileSize / m_header.pageSize, 0xFFFFFFFFu));
    if (m_pageCount < 3)
        throw OxJetError(L"not an Access database: the file is too short");
}

void OxJetPageFile::readRaw(uint32_t page, uint8_t* out) const {
    if (page >= m_pageCount)
        throw OxJetError(
            oxFormat(L"damaged file: page %u lies past the end of the file "
                     L"(%u pages; truncated?)",
                     page, m_pageCount));
    const size_t size = m_header.pageSize;
    const uint64_t offset = static_cast<uint64_t>(page) * size;
    if (m_fd < 0) {
        std::memcpy(out, m_memory.data() + offset, size);
        return;
    }
    size_t done = 0;
    while (done < size) {
        const ssize_t n = ::pread(m_fd, out + done, size - done, static_cast<off_t>(offset + done));
        if (n < 0 && errno == EINTR)
            continue;
        if (n < 0)
            throw OxJetError(oxFormat(L"cannot read page %u: %s", page, errnoText()));
        if (n == 0)
            throw OxJetError(oxFormat(L"damaged file: page %u is cut short", page));
        done += static_cast<size_t>(n);
    }
}

void OxJetPageFile::read(uint32_t page, uint8_t* out) const {
    readRaw(page, out);
    if (page != 0 && m_header.pageKey != 0)
        rc4(m_header.pageKey ^ page, out, m_header.pageSize);
}

uint32_t OxJetPageFile::rowCount(const uint8_t* page) const {
    const size_t at = m_header.isJet3() ? 8 : 12;
    const uint32_t count = OxJetBytes::u16(page + at);
    if (at + 2 + 2ull * count > m_header.pageSize)
        throw OxJetError(oxFormat(L"damaged file: a data page claims %u rows", count));
    return count;
}

OxJetPageFile::Row OxJetPageFile::row(const uint8_t* page, uint32_t row) const {
    const uint32_t count = rowCount(page);
    if (row >= count)
        throw OxJetError(oxFormat(L"damaged file: row %u of a page with %u rows", row, count));
    const size_t table = m_header.isJet3() ? 10 : 14;
    const uint16_t raw = OxJetBytes::u16(page + table + 2 * row);
    const uint32_t start = raw & 0x1FFF;
    const uint32_t end =
        row == 0 ? m_header.pageSize : (OxJetBytes::u16(page + table + 2 * (row - 1)) & 0x1FFFu);
    if (start < table + 2 * count || start > end || end > m_header.pageSize)
        throw OxJetError(oxFormat(L"damaged file: row %u has offsets %u..%u", row, start, end));
    return Row{start, end - start, static_cast<uint16_t>(raw & 0xC000)};
}
