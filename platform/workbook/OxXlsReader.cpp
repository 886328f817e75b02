#include "platform/workbook/OxXlsReader.h"

#include <algorithm>
#include <cmath>
#include <cstring>

#include "platform/core/OxFormat.h"
#include "platform/core/OxText.h"
#include "platform/workbook/OxCompoundFileReader.h"
#include "platform/workbook/OxWorkbookNumberFormat.h"

namespace {
enum : uint16_t {
    kFormula = 0x0006,
    kEof = 0x000A,
    kExternSheet = 0x0017,
    kName = 0x0018,
    kDate1904 = 0x0022,
    kFilePass = 0x002F,
    kContinue = 0x003C,
    kCodepage = 0x0042,
    kBoundSheet = 0x0085,
    kMulRk = 0x00BD,
    kRString = 0x00D6,
    kXf = 0x00E0,
    kSst = 0x00FC,
    kLabelSst = 0x00FD,
    kSupBook = 0x01AE,
    kInteger = 0x0002,
    kNumber = 0x0203,
    kLabel = 0x0204,
    kBoolErr = 0x0205,
    kString = 0x0207,
    kRk = 0x027E,
    kFormat = 0x041E,
    kBof = 0x0809,
};

constexpr size_t kMaxRowCells = 65536;
constexpr size_t kMaxRowText = 16u << 20;  // characters; 256 full cells hold 8 million

uint16_t u16(const char* p) {
    return static_cast<uint16_t>(static_cast<uint8_t>(p[0]) | static_cast<uint8_t>(p[1]) << 8);
}
uint32_t u32(const char* p) {
    return static_cast<uint32_t>(u16(p)) | static_cast<uint32_t>(u16(p + 2)) << 16;
}
double f64(const char* p) {
    double d;
    std::memcpy(&d, p, 8);
    return d;
}

double decodeRk(uint32_t rk) {
    double v;
    if (rk & 2) {
        v = static_cast<double>(static_cast<int32_t>(rk) >> 2);
    } else {
        const uint64_t bits = static_cast<uint64_t>(rk & 0xFFFFFFFCu) << 32;
        std::memcpy(&v, &bits, 8);
    }
    return (rk & 1) ? v / 100 : v;
}

[[noreturn]] void corrupt(const std::wstring& what) {
    OxWorkbookError::raise(OxWorkbookError::Corrupt, L"damaged .xls workbook: " + what);
}

// Reads across a record and its CONTINUE records. Character data that a CONTINUE splits
// starts again with its own option byte (compressed or UTF-16).
class Segments {
public:
    Segments(const std::string& stream, const std::vector<OxXlsReader::Segment>& segs)
        : m_stream(stream), m_segs(segs) {}

    bool atEnd() {
        skipEmpty();
        return m_seg >= m_segs.size();
    }
    size_t remainingInSegment() const {
        return m_seg < m_segs.size() ? m_segs[m_seg].size - m_off : 0;
    }
    size_t remainingTotal() const {
        size_t n = remainingInSegment();
        for (size_t i = m_seg + 1; i < m_segs.size(); ++i) n += m_segs[i].size;
        return n;
    }
    uint8_t byte() {
        skipEmpty();
        if (m_seg >= m_segs.size())
            corrupt(L"a string runs past the end of its record");
        return static_cast<uint8_t>(m_stream[m_segs[m_seg].offset + m_off++]);
    }
    uint16_t word() {
        const uint16_t lo = byte();
        return static_cast<uint16_t>(lo | byte() << 8);
    }
    uint32_t dword() {
        const uint32_t lo = word();
        return lo | static_cast<uint32_t>(word()) << 16;
    }
    void skip(uint64_t n) {
        while (n > 0) {
            skipEmpty();
            if (m_seg >= m_segs.size())
                corrupt(L"a string runs past the end of its record");
            const size_t take = static_cast<size_t>(std::min<uint64_t>(n, remainingInSegment()));
            m_off += take;
            n -= take;
        }
    }
    void chars(size_t count, bool highByte, std::wstring& out) {
        // Never reserve more than the bytes left could hold.
        out.reserve(out.size() + std::min(count, remainingTotal()));
        while (count > 0) {
            if (remainingInSegment() == 0) {
                ++m_seg;
                m_off = 0;
                skipEmpty();
                if (m_seg >= m_segs.size())
                    corrupt(L"a string runs past the end of its record");
                highByte = (byte() & 1) != 0;
                continue;
            }
            const char* p = m_stream.data() + m_segs[m_seg].offset + m_off;
            const size_t width = highByte ? 2 : 1;
            size_t n = std::min(count, remainingInSegment() / width);
            if (n == 0)
                corrupt(L"a character is split across records");
            if (highByte) {
                appendUtf16(p, n, out);
            } else {
                for (size_t i = 0; i < n; ++i)
                    out.push_back(static_cast<wchar_t>(static_cast<uint8_t>(p[i])));
            }
            m_off += n * width;
            count -= n;
        }
    }

private:
    void skipEmpty() {
        while (m_seg < m_segs.size() && m_off >= m_segs[m_seg].size) {
            ++m_seg;
            m_off = 0;
        }
    }
    void appendUtf16(const char* p, size_t n, std::wstring& out) {
        for (size_t i = 0; i < n; ++i) {
            char32_t c = u16(p + 2 * i);
            if (m_highSurrogate) {
                if (c >= 0xDC00 && c <= 0xDFFF) {
                    out.back() = static_cast<wchar_t>(0x10000 + ((m_highSurrogate - 0xD800) << 10) +
                                                      (c - 0xDC00));
                    m_highSurrogate = 0;
                    continue;
                }
                out.back() = 0xFFFD;
                m_highSurrogate = 0;
            }
            if (c >= 0xD800 && c <= 0xDBFF)
                m_highSurrogate = c;
            else if (c >= 0xDC00 && c <= 0xDFFF)
                c = 0xFFFD;
            out.push_back(static_cast<wchar_t>(m_highSurrogate ? 0xFFFD : c));
        }
    }

    const std::string& m_stream;
    const std::vector<OxXlsReader::Segment>& m_segs;
    size_t m_seg = 0;
    size_t m_off = 0;

public:
    char32_t m_highSurrogate = 0;
    // A string ends with no half pair pending.
    void endString() { m_highSurrogate = 0; }
};

std::wstring quoteSheet(const std::wstring& name) {
    bool plain = !name.empty();
    for (wchar_t c : name)
        if (!(std::iswalnum(static_cast<wint_t>(c)) || c == L'_' || c == L'.'))
            plain = false;
    if (plain)
        return name;
    std::wstring q = L"'";
    for (wchar_t c : name) {
        q.push_back(c);
        if (c == L'\'')
            q.push_back(L'\'');
    }
    return q + L"'";
}

std::wstring cellRef(uint32_t row, uint32_t col) {
    std::wstring letters;
    for (uint32_t c = col + 1; c > 0; c = (c - 1) / 26)
        letters.insert(letters.begin(), static_cast<wchar_t>(L'A' + (c - 1) % 26));
    return L"$" + letters + L"$" + std::to_wstring(row + 1);
}

const wchar_t* const kBuiltinNames[] = {
    L"Consolidate_Area", L"Auto_Open",       L"Auto_Close",   L"Extract",        L"Database",
    L"Criteria",         L"Print_Area",      L"Print_Titles", L"Recorder",       L"Data_Form",
    L"Auto_Activate",    L"Auto_Deactivate", L"Sheet_Title",  L"_FilterDatabase"};
}  // namespace

OxXlsReader::OxXlsReader(std::unique_ptr<OxWorkbookSource> source) : m_source(std::move(source)) {
    m_info.format = OxWorkbookInfo::Xls;
}

OxXlsReader::~OxXlsReader() = default;

bool OxXlsReader::readRecord(size_t pos, Record& rec, bool strict) const {
    if (pos + 4 > m_stream.size())
        return false;
    rec.type = u16(m_stream.data() + pos);
    rec.size = u16(m_stream.data() + pos + 2);
    rec.offset = pos + 4;
    if (rec.offset + rec.size > m_stream.size()) {
        if (!strict)
            return false;
        corrupt(L"a record runs past the end of the workbook stream (truncated file?)");
    }
    return true;
}

std::vector<OxXlsReader::Segment> OxXlsReader::continued(const Record& first, size_t& next) const {
    std::vector<Segment> segs{{first.offset, first.size}};
    next = first.offset + first.size;
    Record rec{};
    while (readRecord(next, rec) && rec.type == kContinue) {
        segs.push_back({rec.offset, rec.size});
        next = rec.offset + rec.size;
    }
    return segs;
}

void OxXlsReader::doOpen() {
    OxCompoundFileReader cfb;
    OxWorkbookError error;
    if (!cfb.open(*m_source, error))
        throw error;
    if (cfb.hasRootStream(L"EncryptedPackage") || cfb.hasRootStream(L"EncryptionInfo"))
        OxWorkbookError::raise(OxWorkbookError::Encrypted,
                               L"the workbook is encrypted: it cannot be read without its "
                               L"password");
    const wchar_t* name = cfb.hasRootStream(L"Workbook") ? L"Workbook"
                          : cfb.hasRootStream(L"Book")   ? L"Book"
                                                         : nullptr;
    if (!name)
        OxWorkbookError::raise(OxWorkbookError::Unsupported,
                               L"the compound file holds no workbook stream (not an .xls file)");
    if (!cfb.readRootStream(name, m_stream, error))
        throw error;
    m_source.reset();  // everything needed is in m_stream now
    parseGlobals();
}

void OxXlsReader::readByteString(const char* p, size_t avail, size_t lenBytes,
                                 std::wstring& out) const {
    // lenBytes is the width of the length field (1 or 2) before the 8-bit characters.
    if (avail < lenBytes)
        corrupt(L"a string is cut short");
    const size_t cch = lenBytes == 1 ? static_cast<uint8_t>(*p) : u16(p);
    if (avail - lenBytes < cch)
        corrupt(L"a string is cut short");
    m_codepage->decode(std::string_view(p + lenBytes, cch), out);
}

void OxXlsReader::readUnicodeString(const std::vector<Segment>& segments, size_t lenBytes,
                                    std::wstring& out) const {
    Segments in(m_stream, segments);
    const size_t cch = lenBytes == 1 ? in.byte() : in.word();
    const uint8_t flags = in.byte();
    out.clear();
    in.chars(cch, (flags & 1) != 0, out);
}

void OxXlsReader::parseGlobals() {
    Record rec{};
    if (!readRecord(0, rec) || rec.type != kBof || rec.size < 4)
        corrupt(L"the workbook stream does not start with a BOF record");
    const uint16_t vers = u16(m_stream.data() + rec.offset);
    if (vers == 0x0600)
        m_biff = 8;
    else if (vers == 0x0500 || vers == 0x0400 || vers == 0)
        m_biff = 5;
    else
        m_biff = 8;
    m_info.biffVersion = m_biff;
    uint16_t codepage = 1252;

    struct Bound {
        uint32_t offset;
        uint8_t state;
        uint8_t kind;
        std::wstring name;
    };
    std::vector<Bound> bounds;
    std::vector<std::pair<uint16_t, std::wstring>> formats;
    std::vector<uint16_t> xfFormat;
    std::vector<Segment> sst;
    std::vector<Record> names;
    std::vector<std::pair<uint16_t, uint16_t>> xti;  // SUPBOOK index, first tab
    std::vector<bool> selfBook;

    size_t pos = rec.offset + rec.size;
    bool ended = false;
    // The code page must be known before 8-bit strings are decoded: a first pass finds it.
    for (size_t p = pos; readRecord(p, rec) && rec.type != kEof; p = rec.offset + rec.size)
        if (rec.type == kCodepage && rec.size >= 2)
            codepage = u16(m_stream.data() + rec.offset);
    m_codepageOwner = std::make_unique<OxWorkbookCodepage>(codepage);
    m_codepage = m_codepageOwner.get();

    while (!ended && readRecord(pos, rec)) {
        const char* d = m_stream.data() + rec.offset;
        size_t next = rec.offset + rec.size;
        switch (rec.type) {
            case kEof:
                ended = true;
                break;
            case kFilePass:
                OxWorkbookError::raise(OxWorkbookError::Encrypted,
                                       L"the workbook is encrypted: it cannot be read without "
                                       L"its password");
            case kDate1904:
                if (rec.size >= 2)
                    m_info.date1904 = u16(d) != 0;
                break;
            case kFormat:
                if (rec.size >= 3) {
                    std::wstring code;
                    if (m_biff == 8) {
                        size_t after = 0;
                        auto segs = continued(rec, after);
                        segs[0].offset += 2;
                        segs[0].size -= 2;
                        readUnicodeString(segs, 2, code);
                    } else {
                        readByteString(d + 2, rec.size - 2, 1, code);
                    }
                    formats.emplace_back(u16(d), std::move(code));
                }
                break;
            case kXf:
                if (rec.size >= 4)
                    xfFormat.push_back(u16(d + 2));
                break;
            case kBoundSheet:
                if (rec.size >= 7) {
                    Bound b{u32(d), static_cast<uint8_t>(d[4] & 3), static_cast<uint8_t>(d[5]), {}};
                    if (m_biff == 8) {
                        std::vector<Segment> segs{
                            {rec.offset + 6, static_cast<size_t>(rec.size - 6)}};
                        readUnicodeString(segs, 1, b.name);
                    } else {
                        readByteString(d + 6, rec.size - 6, 1, b.name);
                    }
                    bounds.push_back(std::move(b));
                }
                break;
            case kSst:
                if (m_biff == 8) {
                    sst = continued(rec, next);
                }
                break;
            case kName:
                names.push_back(rec);
                break;
            case kSupBook:
                // The workbook's own book: tab count then 0x0401.
                selfBook.push_back(rec.size == 4 && u16(d + 2) == 0x0401);
                break;
            case kExternSheet:
                if (m_biff == 8 && rec.size >= 2) {
                    const size_t count = std::min<size_t>(u16(d), (rec.size - 2) / 6);
                    for (size_t i = 0; i < count; ++i)
                        xti.emplace_back(u16(d + 2 + 6 * i), u16(d + 4 + 6 * i));
                }
                break;
            default:
                break;
        }
        pos = next;
    }
    if (!ended)
        corrupt(L"the workbook globals have no EOF record (truncated file?)");

    // Which cell formats show dates.
    m_xfIsDate.assign(xfFormat.size(), false);
    for (size_t i = 0; i < xfFormat.size(); ++i) {
        const uint16_t id = xfFormat[i];
        bool date = false;
        bool custom = false;
        for (const auto& f : formats)
            if (f.first == id) {
                custom = true;
                date = OxWorkbookNumberFormat::isDateCode(f.second);
            }
        m_xfIsDate[i] = custom ? date : OxWorkbookNumberFormat::isBuiltinDate(id);
    }
    if (!sst.empty())
        parseSst(sst);

    // Substreams follow the globals; a BOUNDSHEET offset that misses a BOF falls back to
    // the substream in the same position.
    // A truncated last sheet is reported when it is read, not here.
    std::vector<size_t> starts;
    size_t p = pos;
    while (readRecord(p, rec, false)) {
        if (rec.type != kBof) {
            p = rec.offset + rec.size;
            continue;
        }
        starts.push_back(p);
        int depth = 0;
        while (readRecord(p, rec, false)) {
            p = rec.offset + rec.size;
            if (rec.type == kBof)
                ++depth;
            else if (rec.type == kEof && --depth == 0)
                break;
        }
    }
    std::vector<std::wstring> allNames;
    std::vector<int> tabToSheet;
    for (size_t i = 0; i < bounds.size(); ++i) {
        const Bound& b = bounds[i];
        allNames.push_back(b.name);
        size_t start = SIZE_MAX;
        Record at{};
        if (b.offset < m_stream.size() && readRecord(b.offset, at, false) && at.type == kBof)
            start = b.offset;
        else if (i < starts.size())
            start = starts[i];
        bool worksheet = b.kind == 0 && start != SIZE_MAX;
        if (worksheet && readRecord(start, at, false) && at.size >= 4) {
            const uint16_t dt = u16(m_stream.data() + at.offset + 2);
            worksheet = dt == 0x0010 || dt == 0x0000;
        }
        tabToSheet.push_back(worksheet ? static_cast<int>(m_sheets.size()) : -1);
        if (!worksheet)
            continue;  // chart, macro and module sheets hold no cells to read
        m_sheets.push_back({start});
        OxWorkbookSheetInfo info;
        info.name = b.name;
        info.visibility = static_cast<OxWorkbookSheetInfo::Visibility>(b.state > 2 ? 1 : b.state);
        m_info.sheets.push_back(std::move(info));
    }

    // Defined names: the plain cell and area references are rendered, others kept unnamed.
    if (m_biff == 8) {
        for (const Record& r : names) {
            const char* d = m_stream.data() + r.offset;
            if (r.size < 15)
                continue;
            const uint16_t flags = u16(d);
            const uint8_t cch = static_cast<uint8_t>(d[3]);
            const uint16_t cce = u16(d + 4);
            const uint16_t itab = u16(d + 8);
            OxWorkbookDefinedName dn;
            dn.hidden = (flags & 1) != 0;
            std::vector<Segment> segs{{r.offset + 14, static_cast<size_t>(r.size - 14)}};
            Segments in(m_stream, segs);
            const uint8_t sflags = in.byte();
            in.chars(cch, (sflags & 1) != 0, dn.name);
            if ((flags & 0x20) && !dn.name.empty()) {
                const auto code = static_cast<size_t>(dn.name[0]);
                dn.name = L"_xlnm." + std::wstring(code < std::size(kBuiltinNames)
                                                       ? kBuiltinNames[code]
                                                       : L"Builtin" + std::to_wstring(code));
            }
            dn.sheet = itab > 0 && itab <= tabToSheet.size() ? tabToSheet[itab - 1] : -1;
            const size_t fstart = r.offset + 14 + (r.size - 14 - in.remainingTotal());
            if (cce >= 7 && fstart + cce <= r.offset + r.size) {
                const char* f = m_stream.data() + fstart;
                const uint8_t ptg = static_cast<uint8_t>(f[0]) & 0x1F;
                const uint16_t ixti = u16(f + 1);
                std::wstring sheet;
                if (ixti < xti.size() && xti[ixti].first < selfBook.size() &&
                    selfBook[xti[ixti].first] && xti[ixti].second < allNames.size())
                    sheet = quoteSheet(allNames[xti[ixti].second]) + L"!";
                if (!sheet.empty() && ptg == 0x1B && cce == 11) {
                    dn.formula = sheet + cellRef(u16(f + 3), u16(f + 7) & 0x3FFF) + L":" +
                                 cellRef(u16(f + 5), u16(f + 9) & 0x3FFF);
                } else if (!sheet.empty() && ptg == 0x1A && cce == 7) {
                    dn.formula = sheet + cellRef(u16(f + 3), u16(f + 5) & 0x3FFF);
                }
            }
            m_info.names.push_back(std::move(dn));
        }
    }
}

void OxXlsReader::parseSst(const std::vector<Segment>& segments) {
    Segments in(m_stream, segments);
    in.skip(8);  // total and unique counts: often wrong, so the strings themselves decide
    m_sstStart.clear();
    m_sstPool.clear();
    m_sstPool.reserve(in.remainingTotal());
    m_sstStart.push_back(0);
    std::wstring text;
    while (!in.atEnd()) {
        const uint16_t cch = in.word();
        const uint8_t flags = in.byte();
        uint16_t runs = 0;
        uint32_t ext = 0;
        if (flags & 0x08)
            runs = in.word();
        if (flags & 0x04)
            ext = in.dword();
        text.clear();
        in.chars(cch, (flags & 1) != 0, text);
        OxText::appendUtf8(m_sstPool, text);
        in.endString();
        // Formatting runs and phonetic text are not part of the value.
        in.skip(static_cast<uint64_t>(runs) * 4 + ext);
        m_sstStart.push_back(m_sstPool.size());
    }
}

void OxXlsReader::doBeginSheet(size_t index) {
    m_pos = m_sheets[index].start;
    m_end = m_stream.size();
    m_depth = 0;
    m_pendingString = false;
    m_haveRow = false;
    m_sheetDone = false;
    m_row.cells.clear();
}

OxWorkbookCell OxXlsReader::numberCell(uint32_t col, uint16_t xf, double value) const {
    OxWorkbookCell c = OxWorkbookCell::makeNumber(col, value);
    double platform = 0;
    if (isDateXf(xf) && OxWorkbookCell::workbookToPlatformSerial(value, m_info.date1904, platform))
        c.type = OxWorkbookCell::Date;
    return c;
}

void OxXlsReader::finishRow(OxWorkbookRow& out) {
    if (!m_sorted) {
        auto& cells = m_row.cells;
        std::stable_sort(
            cells.begin(), cells.end(),
            [](const OxWorkbookCell& a, const OxWorkbookCell& b) { return a.column < b.column; });
        // A cell written twice: the later record wins.
        size_t w = 0;
        for (size_t i = 0; i < cells.size(); ++i) {
            if (w > 0 && cells[w - 1].column == cells[i].column)
                cells[w - 1] = std::move(cells[i]);
            else
                cells[w++] = std::move(cells[i]);
        }
        cells.resize(w);
    }
    std::swap(out, m_row);
    m_row.cells.clear();
    m_haveRow = false;
    m_sorted = true;
}

bool OxXlsReader::addCell(uint32_t row, OxWorkbookCell&& cell, OxWorkbookRow& out) {
    bool finished = false;
    if (m_haveRow && row != m_row.index) {
        finishRow(out);
        finished = true;
    }
    if (!m_haveRow) {
        m_haveRow = true;
        m_row.index = row;
        m_sorted = true;
        m_rowText = 0;
    }
    // A hostile file can point many cells of one row at long strings: bound the row.
    m_rowText += cell.text.size();
    if (m_row.cells.size() >= kMaxRowCells || m_rowText > kMaxRowText)
        OxWorkbookError::raise(
            OxWorkbookError::Limit,
            oxFormat(L"row %d holds more cells or text than this reader takes in one row",
                     static_cast<unsigned long long>(row) + 1));
    if (!m_row.cells.empty() && m_row.cells.back().column >= cell.column)
        m_sorted = false;
    m_row.cells.push_back(std::move(cell));
    return finished;
}

bool OxXlsReader::doNextRow(OxWorkbookRow& out) {
    Record rec{};
    while (!m_sheetDone) {
        if (!readRecord(m_pos, rec)) {
            m_sheetDone = true;  // a sheet cut off before its EOF: keep what was read
            break;
        }
        const char* d = m_stream.data() + rec.offset;
        size_t next = rec.offset + rec.size;
        bool emitted = false;
        if (rec.type == kBof) {
            ++m_depth;
        } else if (rec.type == kEof) {
            if (--m_depth <= 0)
                m_sheetDone = true;
        } else if (m_depth == 1) {
            // Every cell record starts with row, column and format index.
            const bool cellRecord = rec.size >= 6;
            const uint32_t row = cellRecord ? u16(d) : 0;
            const uint32_t col = cellRecord ? u16(d + 2) : 0;
            const uint16_t xf = cellRecord ? u16(d + 4) : 0;
            if (m_pendingString && rec.type != kString &&
                (rec.type == kNumber || rec.type == kLabelSst || rec.type == kRk ||
                 rec.type == kMulRk || rec.type == kLabel || rec.type == kBoolErr ||
                 rec.type == kFormula || rec.type == kRString)) {
                // A string formula without its STRING record: an empty text.
                m_pendingString = false;
                emitted |= addCell(m_pendingRow, OxWorkbookCell::makeText(m_pendingCol, {}), out);
            }
            switch (rec.type) {
                case kNumber:
                    if (rec.size >= 14)
                        emitted |= addCell(row, numberCell(col, xf, f64(d + 6)), out);
                    break;
                case kRk:
                    if (rec.size >= 10)
                        emitted |= addCell(row, numberCell(col, xf, decodeRk(u32(d + 6))), out);
                    break;
                case kInteger:
                    if (rec.size >= 9)
                        emitted |= addCell(row, numberCell(col, 0, u16(d + 7)), out);
                    break;
                case kMulRk:
                    if (rec.size >= 12) {
                        const size_t n = (rec.size - 6) / 6;
                        for (size_t i = 0; i < n; ++i) {
                            const char* e = d + 4 + 6 * i;
                            emitted |= addCell(row,
                                               numberCell(static_cast<uint32_t>(col + i), u16(e),
                                                          decodeRk(u32(e + 2))),
                                               out);
                        }
                    }
                    break;
                case kLabelSst:
                    if (rec.size >= 10) {
                        const uint32_t isst = u32(d + 6);
                        const size_t count = m_sstStart.empty() ? 0 : m_sstStart.size() - 1;
                        if (isst >= count)
                            corrupt(
                                oxFormat(L"cell %s refers to string %d, past the %d shared "
                                         L"strings",
                                         cellRef(row, col), isst, count));
                        const size_t a = m_sstStart[isst];
                        OxWorkbookCell text = OxWorkbookCell::makeText(col, {});
                        OxText::appendFromUtf8(text.text, std::string_view(m_sstPool).substr(
                                                              a, m_sstStart[isst + 1] - a));
                        emitted |= addCell(row, std::move(text), out);
                    }
                    break;
                case kLabel:
                case kRString:
                    if (rec.size >= 8) {
                        std::wstring text;
                        if (m_biff == 8) {
                            std::vector<Segment> segs{
                                {rec.offset + 6, static_cast<size_t>(rec.size - 6)}};
                            readUnicodeString(segs, 2, text);
                        } else {
                            readByteString(d + 6, rec.size - 6, 2, text);
                        }
                        emitted |=
                            addCell(row, OxWorkbookCell::makeText(col, std::move(text)), out);
                    }
                    break;
                case kBoolErr:
                    if (rec.size >= 8) {
                        const uint8_t v = static_cast<uint8_t>(d[6]);
                        emitted |= addCell(row,
                                           d[7] ? OxWorkbookCell::makeError(col, v)
                                                : OxWorkbookCell::makeBoolean(col, v != 0),
                                           out);
                    }
                    break;
                case kFormula:
                    if (rec.size >= 20) {
                        const char* v = d + 6;
                        if (u16(v + 6) != 0xFFFF) {
                            emitted |= addCell(row, numberCell(col, xf, f64(v)), out);
                        } else {
                            switch (static_cast<uint8_t>(v[0])) {
                                case 0:  // text, in the STRING record that follows
                                    m_pendingString = true;
                                    m_pendingRow = row;
                                    m_pendingCol = col;
                                    break;
                                case 1:
                                    emitted |= addCell(
                                        row, OxWorkbookCell::makeBoolean(col, v[2] != 0), out);
                                    break;
                                case 2:
                                    emitted |= addCell(
                                        row,
                                        OxWorkbookCell::makeError(col, static_cast<uint8_t>(v[2])),
                                        out);
                                    break;
                                case 3:
                                    emitted |= addCell(row, OxWorkbookCell::makeText(col, {}), out);
                                    break;
                                default:
                                    break;
                            }
                        }
                    }
                    break;
                case kString:
                    if (m_pendingString) {
                        m_pendingString = false;
                        std::wstring text;
                        if (m_biff == 8) {
                            readUnicodeString(continued(rec, next), 2, text);
                        } else {
                            readByteString(d, rec.size, 2, text);
                        }
                        emitted |=
                            addCell(m_pendingRow,
                                    OxWorkbookCell::makeText(m_pendingCol, std::move(text)), out);
                    }
                    break;
                default:
                    break;
            }
        }
        m_pos = next;
        if (emitted)
            return true;
    }
    if (m_pendingString) {
        m_pendingString = false;
        if (addCell(m_pendingRow, OxWorkbookCell::makeText(m_pendingCol, {}), out))
            return true;
    }
    if (m_haveRow) {
        finishRow(out);
        return true;
    }
    return false;
}
