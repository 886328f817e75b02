#include "platform/workbook/OxZipWriter.h"

#include <zlib.h>

#include <cstring>

namespace {
void put16(std::string& s, uint32_t v) {
    s.push_back(static_cast<char>(v & 0xFF));
    s.push_back(static_cast<char>((v >> 8) & 0xFF));
}
void put32(std::string& s, uint32_t v) {
    put16(s, v & 0xFFFF);
    put16(s, v >> 16);
}
constexpr uint64_t kMax32 = 0xFFFFFFFFu;
constexpr uint32_t kDosDate = 0x0021;  // 1980-01-01: the output does not depend on the clock

[[noreturn]] void tooLarge() {
    OxWorkbookError::raise(OxWorkbookError::Limit,
                           L"the workbook is too large for its zip container (4 GB per part)");
}
}  // namespace

OxZipWriter::OxZipWriter(OxWorkbookOutputFile& out, int level) : m_out(out), m_level(level) {
    m_buffer.resize(1 << 16);
}

OxZipWriter::~OxZipWriter() {
    if (m_z) {
        deflateEnd(m_z);
        delete m_z;
    }
}

void OxZipWriter::beginEntry(const std::string& name) {
    if (m_entries.size() >= 0xFFFF)
        tooLarge();
    Entry e{name, m_out.position(), 0, 0, 0};
    if (e.offset > kMax32)
        tooLarge();
    std::string h;
    put32(h, 0x04034b50);
    put16(h, 20);
    put16(h, 0);
    put16(h, 8);
    put16(h, 0);
    put16(h, kDosDate);
    put32(h, 0);  // crc, sizes: patched by endEntry
    put32(h, 0);
    put32(h, 0);
    put16(h, static_cast<uint32_t>(name.size()));
    put16(h, 0);
    h += name;
    m_out.write(h);
    m_entries.push_back(e);
    if (!m_z) {
        m_z = new z_stream{};
    } else {
        deflateEnd(m_z);
        *m_z = z_stream{};
    }
    if (deflateInit2(m_z, m_level, Z_DEFLATED, -15, 8, Z_DEFAULT_STRATEGY) != Z_OK)
        OxWorkbookError::raise(OxWorkbookError::Limit, L"cannot start compression");
    m_open = true;
}

void OxZipWriter::deflateSome(int flush) {
    for (;;) {
        m_z->next_out = reinterpret_cast<Bytef*>(m_buffer.data());
        m_z->avail_out = static_cast<uInt>(m_buffer.size());
        const int rc = deflate(m_z, flush);
        if (rc == Z_STREAM_ERROR)
            OxWorkbookError::raise(OxWorkbookError::Limit, L"compression failed");
        const size_t produced = m_buffer.size() - m_z->avail_out;
        if (produced)
            m_out.write(m_buffer.data(), produced);
        m_entries.back().compressed += produced;
        if (flush == Z_FINISH ? rc == Z_STREAM_END : m_z->avail_out != 0)
            break;
    }
}

void OxZipWriter::write(const char* data, size_t len) {
    Entry& e = m_entries.back();
    while (len > 0) {
        const size_t take = len > (1u << 30) ? (1u << 30) : len;
        e.crc = static_cast<uint32_t>(
            crc32(e.crc, reinterpret_cast<const Bytef*>(data), static_cast<uInt>(take)));
        e.size += take;
        m_z->next_in = reinterpret_cast<Bytef*>(const_cast<char*>(data));
        m_z->avail_in = static_cast<uInt>(take);
        deflateSome(Z_NO_FLUSH);
        data += take;
        len -= take;
    }
    if (e.size > kMax32)
        tooLarge();
}

void OxZipWriter::endEntry() {
    m_z->next_in = nullptr;
    m_z->avail_in = 0;
    deflateSome(Z_FINISH);
    m_open = false;
    const Entry& e = m_entries.back();
    if (e.compressed > kMax32 || e.size > kMax32)
        tooLarge();
    std::string patch;
    put32(patch, e.crc);
    put32(patch, static_cast<uint32_t>(e.compressed));
    put32(patch, static_cast<uint32_t>(e.size));
    m_out.writeAt(e.offset + 14, patch.data(), patch.size());
}

void OxZipWriter::addEntry(const std::string& name, const std::string& data) {
    beginEntry(name);
    write(data);
    endEntry();
}

void OxZipWriter::finish() {
    const uint64_t start = m_out.position();
    std::string cd;
    for (const Entry& e : m_entries) {
        put32(cd, 0x02014b50);
        put16(cd, 20);
        put16(cd, 20);
        put16(cd, 0);
        put16(cd, 8);
        put16(cd, 0);
        put16(cd, kDosDate);
        put32(cd, e.crc);
        put32(cd, static_cast<uint32_t>(e.compressed));
        put32(cd, static_cast<uint32_t>(e.size));
        put16(cd, static_cast<uint32_t>(e.name.size()));
        put16(cd, 0);
        put16(cd, 0);
        put16(cd, 0);
        put16(cd, 0);
        put32(cd, 0);
        put32(cd, static_cast<uint32_t>(e.offset));
        cd += e.name;
    }
    const uint64_t cdSize = cd.size();
    if (start > kMax32 || cdSize > kMax32)
        tooLarge();
    put32(cd, 0x06054b50);
    put16(cd, 0);
    put16(cd, 0);
    put16(cd, static_cast<uint32_t>(m_entries.size()));
    put16(cd, static_cast<uint32_t>(m_entries.size()));
    put32(cd, static_cast<uint32_t>(cdSize));
    put32(cd, static_cast<uint32_t>(start));
    put16(cd, 0);
    m_out.write(cd);
}
