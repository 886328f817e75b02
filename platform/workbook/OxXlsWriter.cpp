#include "platform/workbook/OxXlsWriter.h"

#include <cerrno>
#include <cstring>

#include "platform/core/OxFormat.h"
#include "platform/core/OxText.h"
#include "platform/workbook/OxCompoundFileWriter.h"

namespace {
constexpr size_t kMaxRecord = 8224;
constexpr uint16_t kDefaultXf = 15;
constexpr uint16_t kDateXf = 16;
constexpr uint16_t kDateFormat = 164;

void put8(std::string& s, uint32_t v) {
    s.push_back(static_cast<char>(v & 0xFF));
}
void put16(std::string& s, uint32_t v) {
    put8(s, v);
    put8(s, v >> 8);
}
void put32(std::string& s, uint32_t v) {
    put16(s, v & 0xFFFF);
    put16(s, v >> 16);
}
void putDouble(std::string& s, double d) {
    char b[8];
    std::memcpy(b, &d, 8);
    s.append(b, 8);
}

void record(std::string& out, uint16_t type, const std::string& data) {
    put16(out, type);
    put16(out, static_cast<uint32_t>(data.size()));
    out += data;
}

bool needsWide(const std::u16string& s) {
    for (char16_t c : s)
        if (c > 0xFF)
            return true;
    return false;
}

void putChars(std::string& out, const std::u16string& s, size_t from, size_t n, bool wide) {
    for (size_t i = from; i < from + n; ++i) {
        if (wide)
            put16(out, s[i]);
        else
            put8(out, s[i]);
    }
}

// XLUnicodeString with a 1- or 2-byte length, for names and format codes.
std::string unicodeString(const std::wstring& text, int lenBytes) {
    const std::u16string s = OxText::toUtf16(text);
    std::string out;
    if (lenBytes == 1)
        put8(out, static_cast<uint32_t>(s.size()));
    else
        put16(out, static_cast<uint32_t>(s.size()));
    const bool wide = needsWide(s);
    put8(out, wide ? 1 : 0);
    putChars(out, s, 0, s.size(), wide);
    return out;
}

std::string font(uint16_t grbit, uint16_t weight) {
    std::string f;
    put16(f, 200);  // 10 points
    put16(f, grbit);
    put16(f, 0x7FFF);
    put16(f, weight);
    put16(f, 0);
    put8(f, 0);
    put8(f, 0);
    put8(f, 0);
    put8(f, 0);
    f += unicodeString(L"Arial", 1);
    return f;
}

std::string xf(uint16_t fontIndex, uint16_t format, uint16_t flags, uint8_t used) {
    std::string x;
    put16(x, fontIndex);
    put16(x, format);
    put16(x, flags);
    put8(x, 0x20);  // general alignment, bottom
    put8(x, 0);
    put8(x, 0);
    put8(x, used);
    put32(x, 0);
    put32(x, 0);
    put16(x, 0x20C0);  // default pattern colours
    return x;
}

// Builds one record of at most 8224 bytes, then CONTINUE records, for the string table.
class ContinuedRecord {
public:
    ContinuedRecord(std::string& out, uint16_t type) : m_out(out) { start(type); }
    size_t room() const { return kMaxRecord - size(); }
    size_t size() const { return m_out.size() - m_start - 4; }
    size_t offsetInRecord() const { return size() + 4; }
    void start(uint16_t type) {
        close();
        m_start = m_out.size();
        put16(m_out, type);
        put16(m_out, 0);
    }
    void close() {
        if (m_start == SIZE_MAX)
            return;
        const size_t n = size();
        m_out[m_start + 2] = static_cast<char>(n & 0xFF);
        m_out[m_start + 3] = static_cast<char>(n >> 8);
    }
    std::string& out() { return m_out; }

private:
    std::string& m_out;
    size_t m_start = SIZE_MAX;
};

const char* const kCurrencyFormats[][2] = {
    {"5", "\"$\"#,##0_);\\(\"$\"#,##0\\)"},
    {"6", "\"$\"#,##0_);[Red]\\(\"$\"#,##0\\)"},
    {"7", "\"$\"#,##0.00_);\\(\"$\"#,##0.00\\)"},
    {"8", "\"$\"#,##0.00_);[Red]\\(\"$\"#,##0.00\\)"},
    {"42", "_(\"$\"* #,##0_);_(\"$\"* \\(#,##0\\);_(\"$\"* \"-\"_);_(@_)"},
    {"41", "_(* #,##0_);_(* \\(#,##0\\);_(* \"-\"_);_(@_)"},
    {"44", "_(\"$\"* #,##0.00_);_(\"$\"* \\(#,##0.00\\);_(\"$\"* \"-\"??_);_(@_)"},
    {"43", "_(* #,##0.00_);_(* \\(#,##0.00\\);_(* \"-\"??_);_(@_)"},
};
}  // namespace

OxXlsWriter::OxXlsWriter() : OxWorkbookWriter(65536, 256) {}

OxXlsWriter::~OxXlsWriter() {
    doAbandon();
}

void OxXlsWriter::doAbandon() noexcept {
    if (m_scratch) {
        std::fclose(m_scratch);
        m_scratch = nullptr;
    }
    m_out.discard();
}

void OxXlsWriter::doCreate(const std::wstring& path) {
    m_out.create(path);
    m_scratch = std::tmpfile();
    if (!m_scratch)
        OxWorkbookError::raise(OxWorkbookError::Io,
                               oxFormat(L"cannot create a scratch file: %s", std::strerror(errno)));
}

void OxXlsWriter::scratch(const std::string& bytes) {
    if (!bytes.empty() && std::fwrite(bytes.data(), 1, bytes.size(), m_scratch) != bytes.size())
        OxWorkbookError::raise(OxWorkbookError::Io,
                               oxFormat(L"cannot write a scratch file: %s", std::strerror(errno)));
    m_scratchSize += bytes.size();
}

void OxXlsWriter::doAddSheet(const std::wstring&, OxWorkbookSheetInfo::Visibility) {
    finishSheet();
    Sheet s;
    s.start = m_scratchSize;
    std::string r;
    std::string bof;
    put16(bof, 0x0600);
    put16(bof, 0x0010);
    put16(bof, 0x0DBB);
    put16(bof, 0x07CC);
    put32(bof, 0x00000001);
    put32(bof, 0x00000006);
    record(r, 0x0809, bof);
    std::string d;
    put16(d, 0);
    put16(d, 0x00FF);
    record(r, 0x0225, d);  // DEFAULTROWHEIGHT
    d.clear();
    put16(d, 0x04C1);
    record(r, 0x0081, d);  // WSBOOL
    d.clear();
    put16(d, 8);
    record(r, 0x0055, d);  // DEFCOLWIDTH
    s.dimensions = m_scratchSize + r.size();
    record(r, 0x0200, std::string(14, '\0'));  // DIMENSIONS, filled in when the sheet ends
    scratch(r);
    m_sheetData.push_back(s);
    m_sheetOpen = true;
    m_block = UINT32_MAX;
}

uint32_t OxXlsWriter::stringIndex(const std::wstring& text) {
    ++m_sstTotal;
    const auto [it, added] = m_sst.emplace(text, static_cast<uint32_t>(m_sstOrder.size()));
    if (added)
        m_sstOrder.push_back(&it->first);
    return it->second;
}

void OxXlsWriter::flushBlock() {
    std::string r;
    for (const auto& row : m_blockRows) r += row;
    r += m_blockCells;
    scratch(r);
    m_blockRows.clear();
    m_blockCells.clear();
}

void OxXlsWriter::doWriteRow(const OxWorkbookRow& row) {
    Sheet& s = m_sheetData.back();
    uint32_t first = UINT32_MAX, last = 0;
    std::string& cells = m_blockCells;
    const size_t before = cells.size();
    const uint32_t rw = row.index;
    for (const OxWorkbookCell& c : row.cells) {
        std::string d;
        put16(d, rw);
        put16(d, c.column);
        switch (c.type) {
            case OxWorkbookCell::Empty:
                continue;
            case OxWorkbookCell::Number:
            case OxWorkbookCell::Date: {
                double platform = 0;
                const bool date =
                    c.type == OxWorkbookCell::Date &&
                    OxWorkbookCell::workbookToPlatformSerial(c.number, false, platform);
                put16(d, date ? kDateXf : kDefaultXf);
                putDouble(d, c.number);
                record(cells, 0x0203, d);
                break;
            }
            case OxWorkbookCell::Text:
                put16(d, kDefaultXf);
                put32(d, stringIndex(c.text));
                record(cells, 0x00FD, d);
                break;
            case OxWorkbookCell::Boolean:
            case OxWorkbookCell::Error: {
                put16(d, kDefaultXf);
                const bool err = c.type == OxWorkbookCell::Error;
                uint8_t code = err ? c.errorCode() : (c.boolean() ? 1 : 0);
                // Codes only the newer format knows are shown as #N/A here.
                if (err && std::wcscmp(OxWorkbookCell::errorText(code), L"#N/A") == 0)
                    code = OxWorkbookCell::ErrNA;
                put8(d, code);
                put8(d, err ? 1 : 0);
                record(cells, 0x0205, d);
                break;
            }
        }
        if (first == UINT32_MAX)
            first = c.column;
        last = c.column;
    }
    if (cells.size() == before)
        return;
    const uint32_t block = rw / 32;
    if (block != m_block) {
        // Cells of the new row were appended after the old block's: split them off.
        std::string mine = cells.substr(before);
        cells.resize(before);
        if (m_block != UINT32_MAX)
            flushBlock();
        m_blockCells = std::move(mine);
        m_block = block;
    }
    std::string r;
    put16(r, rw);
    put16(r, first);
    put16(r, last + 1);
    put16(r, 0x00FF);
    put16(r, 0);
    put16(r, 0);
    put32(r, 0x000F0100);
    std::string rec;
    record(rec, 0x0208, r);
    m_blockRows.push_back(std::move(rec));
    s.hasCells = true;
    s.firstRow = s.firstRow == UINT32_MAX ? rw : s.firstRow;
    s.rows = rw + 1;
    s.firstCol = first < s.firstCol ? first : s.firstCol;
    s.lastCol = last > s.lastCol ? last : s.lastCol;
}

void OxXlsWriter::finishSheet() {
    if (!m_sheetOpen)
        return;
    if (m_block != UINT32_MAX)
        flushBlock();
    m_block = UINT32_MAX;
    std::string r;
    std::string w;
    m_sheetData.back().window = m_scratchSize + 4;
    put16(w, 0x00B6);
    put16(w, 0);
    put16(w, 0);
    put32(w, 64);
    put16(w, 0);
    put16(w, 0);
    put32(w, 0);
    record(r, 0x023E, w);  // WINDOW2
    record(r, 0x000A, {});
    scratch(r);

    Sheet& s = m_sheetData.back();
    std::string dim;
    put32(dim, s.hasCells ? s.firstRow : 0);
    put32(dim, s.hasCells ? s.rows : 0);
    put16(dim, s.hasCells ? s.firstCol : 0);
    put16(dim, s.hasCells ? s.lastCol + 1 : 0);
    put16(dim, 0);
    patchScratch(s.dimensions + 4, dim);
    m_sheetOpen = false;
}

void OxXlsWriter::patchScratch(uint64_t offset, const std::string& bytes) {
    if (std::fflush(m_scratch) != 0 ||
        std::fseek(m_scratch, static_cast<long>(offset), SEEK_SET) != 0 ||
        std::fwrite(bytes.data(), 1, bytes.size(), m_scratch) != bytes.size() ||
        std::fseek(m_scratch, 0, SEEK_END) != 0)
        OxWorkbookError::raise(OxWorkbookError::Io,
                               oxFormat(L"cannot write a scratch file: %s", std::strerror(errno)));
}

std::string OxXlsWriter::globals(const std::vector<uint32_t>& sheetOffsets) const {
    std::string g;
    std::string d;
    auto rec = [&](uint16_t type) {
        record(g, type, d);
        d.clear();
    };
    put16(d, 0x0600);
    put16(d, 0x0005);
    put16(d, 0x0DBB);
    put16(d, 0x07CC);
    put32(d, 0x00000001);
    put32(d, 0x00000006);
    rec(0x0809);  // BOF
    put16(d, 0x04B0);
    rec(0x00E1);  // INTERFACEHDR
    put16(d, 0);
    rec(0x00C1);  // MMS
    rec(0x00E2);  // INTERFACEEND
    d = unicodeString(L"OxQel", 2);
    d.resize(112, ' ');
    rec(0x005C);  // WRITEACCESS
    put16(d, 1200);
    rec(0x0042);  // CODEPAGE: UTF-16
    put16(d, 0);
    rec(0x0161);  // DSF
    for (size_t i = 0; i < m_sheets.size(); ++i) put16(d, static_cast<uint32_t>(i + 1));
    rec(0x013D);  // RRTABID
    put16(d, 0);
    rec(0x0019);  // WINDOWPROTECT
    put16(d, 0);
    rec(0x0012);  // PROTECT
    put16(d, 0);
    rec(0x0013);  // PASSWORD
    put16(d, 0);
    rec(0x01AF);  // PROT4REV
    put16(d, 0);
    rec(0x01BC);  // PROT4REVPASS
    put16(d, 0);
    rec(0x0040);  // BACKUP
    put16(d, 0);
    rec(0x008D);  // HIDEOBJ
    put16(d, 0x0168);
    put16(d, 0x001E);
    put16(d, 0x3A5C);
    put16(d, 0x2328);
    put16(d, 0x0038);
    put16(d, static_cast<uint32_t>(activeSheet()));
    put16(d, 0);
    put16(d, 1);
    put16(d, 0x0258);
    rec(0x003D);  // WINDOW1
    put16(d, 0);
    rec(0x0022);  // DATE1904: the 1900 system
    put16(d, 1);
    rec(0x000E);  // PRECISION
    put16(d, 0);
    rec(0x01B7);  // REFRESHALL
    put16(d, 0);
    rec(0x00DA);  // BOOKBOOL
    // Font 4 is never referenced: readers skip that index.
    const uint16_t fonts[][2] = {{0, 400}, {0, 700}, {2, 400}, {2, 700}, {0, 400}};
    for (const auto& f : fonts) {
        d = font(f[0], f[1]);
        rec(0x0031);
    }
    for (const auto& f : kCurrencyFormats) {
        put16(d, static_cast<uint32_t>(std::stoi(f[0])));
        d += unicodeString(OxText::fromUtf8(f[1]), 2);
        rec(0x041E);
    }
    put16(d, kDateFormat);
    d += unicodeString(L"yyyy-mm-dd hh:mm:ss", 2);
    rec(0x041E);  // FORMAT: the one date format
    // 15 style formats, the default cell format, then the date cell format.
    d = xf(0, 0, 0xFFF5, 0);
    rec(0x00E0);
    for (int i = 1; i < 15; ++i) {
        d = xf(i <= 2 ? 1 : i <= 4 ? 2 : 0, 0, 0xFFF5, 0xF4);
        rec(0x00E0);
    }
    d = xf(0, 0, 0x0001, 0);
    rec(0x00E0);
    d = xf(0, kDateFormat, 0x0001, 0x04);
    rec(0x00E0);
    put16(d, 0x8000);
    put8(d, 0);
    put8(d, 0xFF);
    rec(0x0293);  // STYLE: Normal
    put16(d, 1);
    rec(0x0160);  // USESELFS
    for (size_t i = 0; i < m_sheets.size(); ++i) {
        put32(d, sheetOffsets[i]);
        put8(d, m_sheets[i].visibility);
        put8(d, 0);
        d += unicodeString(m_sheets[i].name, 1);
        rec(0x0085);  // BOUNDSHEET
    }
    put16(d, 1);
    put16(d, 1);
    rec(0x008C);  // COUNTRY

    // The string table: a string's header and first character stay in one record; text
    // cut by a CONTINUE goes on after a fresh option byte there.
    const size_t unique = m_sstOrder.size();
    const size_t bucket = unique / 128 + 1 > 8 ? unique / 128 + 1 : 8;
    std::string ext;
    put16(ext, static_cast<uint32_t>(bucket));
    {
        ContinuedRecord sst(g, 0x00FC);
        put32(g, static_cast<uint32_t>(m_sstTotal > 0xFFFFFFFFu ? 0xFFFFFFFFu : m_sstTotal));
        put32(g, static_cast<uint32_t>(unique));
        for (size_t i = 0; i < unique; ++i) {
            const std::u16string s = OxText::toUtf16(*m_sstOrder[i]);
            const bool wide = needsWide(s);
            const size_t width = wide ? 2 : 1;
            if (sst.room() < 3 + width)
                sst.start(0x003C);
            if (i % bucket == 0) {
                put32(ext, static_cast<uint32_t>(g.size()));
                put16(ext, static_cast<uint32_t>(sst.offsetInRecord()));
                put16(ext, 0);
            }
            put16(g, static_cast<uint32_t>(s.size()));
            put8(g, wide ? 1 : 0);
            size_t done = 0;
            while (done < s.size()) {
                size_t n = sst.room() / width;
                if (n == 0) {
                    sst.start(0x003C);
                    put8(g, wide ? 1 : 0);
                    n = sst.room() / width;
                }
                n = n < s.size() - done ? n : s.size() - done;
                // Keep a surrogate pair in one record: readers decode each piece alone.
                if (done + n < s.size() && s[done + n - 1] >= 0xD800 && s[done + n - 1] <= 0xDBFF &&
                    --n == 0) {
                    sst.start(0x003C);
                    put8(g, 1);
                    continue;
                }
                putChars(g, s, done, n, wide);
                done += n;
            }
        }
        sst.close();
    }
    record(g, 0x00FF, ext);  // EXTSST
    record(g, 0x000A, {});
    return g;
}

void OxXlsWriter::doCommit() {
    finishSheet();
    std::string selected;
    put16(selected, 0x06B6);  // the sheet the workbook opens on: selected and shown
    patchScratch(m_sheetData[activeSheet()].window, selected);
    std::vector<uint32_t> offsets(m_sheets.size(), 0);
    const size_t globalsSize = globals(offsets).size();
    for (size_t i = 0; i < m_sheets.size(); ++i) {
        const uint64_t at = globalsSize + m_sheetData[i].start;
        if (at > 0xFFFFFFFFu)
            OxWorkbookError::raise(OxWorkbookError::Limit,
                                   L"the workbook is too large for an .xls file");
        offsets[i] = static_cast<uint32_t>(at);
    }
    const std::string g = globals(offsets);
    if (std::fflush(m_scratch) != 0 || std::fseek(m_scratch, 0, SEEK_SET) != 0)
        OxWorkbookError::raise(OxWorkbookError::Io, L"cannot read back a scratch file");
    OxCompoundFileWriter::write(m_out, L"Workbook", g.size() + m_scratchSize, [&] {
        m_out.write(g);
        std::string buf(1 << 16, '\0');
        uint64_t left = m_scratchSize;
        while (left > 0) {
            const size_t want = left < buf.size() ? static_cast<size_t>(left) : buf.size();
            if (std::fread(buf.data(), 1, want, m_scratch) != want)
                OxWorkbookError::raise(OxWorkbookError::Io, L"cannot read back a scratch file");
            m_out.write(buf.data(), want);
            left -= want;
        }
    });
    std::fclose(m_scratch);
    m_scratch = nullptr;
    m_out.commit();
}
