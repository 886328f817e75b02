#include "platform/jet/OxJetRowCursor.h"

#include <algorithm>
#include <cstring>

#include "platform/core/OxFormat.h"
#include "platform/jet/OxJetBytes.h"
#include "platform/jet/OxJetPageFile.h"
#include "platform/jet/OxJetUsageMap.h"

namespace {
constexpr uint8_t kDataPage = 0x01;
constexpr uint32_t kLongInline = 0x80;
constexpr uint32_t kLongSingle = 0x40;
constexpr uint32_t kLongLengthMask = 0x3FFFFFFF;
constexpr uint32_t kLongHeader = 12;

[[noreturn]] void bad(const wchar_t* what) {
    throw OxJetError(std::wstring(L"damaged row: ") + what);
}
}  // namespace

// The decoding plan of one column.
struct OxJetRowCursor::Column {
    OxJetType type;
    OxJetValue::Kind kind;
    uint16_t number;
    uint16_t varIndex;
    uint16_t fixedOffset;
    uint16_t length;
    uint8_t scale;
    bool fixed;
    bool supported;
    bool wanted;
};

OxJetRowCursor::OxJetRowCursor(std::shared_ptr<const OxJetPageFile> file,
                               std::shared_ptr<const OxJetTableDef> table, uint16_t codePage,
                               OxJetBadRows badRows)
    : m_file(std::move(file)),
      m_table(std::move(table)),
      m_text(m_file->header().isJet3() ? codePage : 0),
      m_badRows(badRows),
      m_jet3(m_file->header().isJet3()) {
    m_hasVarColumns = m_table->variableColumns > 0;
    for (const OxJetColumn& c : m_table->columns) {
        Column plan{};
        plan.type = static_cast<OxJetType>(c.type);
        plan.number = c.number;
        plan.varIndex = c.varIndex;
        plan.fixedOffset = c.fixedOffset;
        plan.length = c.length;
        plan.scale = c.scale;
        plan.fixed = c.fixed;
        plan.supported = c.supported;
        plan.wanted = true;
        switch (plan.type) {
            case OxJetType::Boolean:
                plan.kind = OxJetValue::Boolean;
                break;
            case OxJetType::Byte:
                plan.kind = OxJetValue::Byte;
                break;
            case OxJetType::Integer:
                plan.kind = OxJetValue::Integer;
                break;
            case OxJetType::Long:
                plan.kind = OxJetValue::Long;
                break;
            case OxJetType::BigInt:
                plan.kind = OxJetValue::BigInt;
                break;
            case OxJetType::Currency:
                plan.kind = OxJetValue::Currency;
                break;
            case OxJetType::Single:
                plan.kind = OxJetValue::Single;
                break;
            case OxJetType::Double:
                plan.kind = OxJetValue::Double;
                break;
            case OxJetType::DateTime:
                plan.kind = OxJetValue::DateTime;
                break;
            case OxJetType::ReplicationId:
                plan.kind = OxJetValue::Guid;
                break;
            case OxJetType::Numeric:
                plan.kind = OxJetValue::Decimal;
                break;
            case OxJetType::Text:
            case OxJetType::Memo:
                plan.kind = OxJetValue::Text;
                break;
            default:
                plan.kind = OxJetValue::Binary;
                break;
        }
        if (!plan.supported)
            plan.kind = OxJetValue::Unsupported;
        m_columns.push_back(plan);
    }
    m_values.resize(m_columns.size());
}

OxJetRowCursor::~OxJetRowCursor() = default;

void OxJetRowCursor::selectColumns(const std::vector<bool>& wanted) {
    for (size_t i = 0; i < m_columns.size(); ++i) {
        m_columns[i].wanted = wanted.empty() || (i < wanted.size() && wanted[i]);
        if (!m_columns[i].wanted)
            m_values[i].kind = OxJetValue::Null;
    }
}

void OxJetRowCursor::rewind() {
    m_started = m_done = m_pageLoaded = false;
    m_nextPage = 0;
    m_error.clear();
    m_firstSkip.clear();
    m_rowsRead = m_skippedRows = m_skippedPages = m_strayPages = 0;
}

bool OxJetRowCursor::fail(const std::wstring& message) {
    m_error = oxFormat(L"table %s: %s", m_table->name, message);
    m_done = true;
    return false;
}

bool OxJetRowCursor::skip(const std::wstring& message, bool page, uint64_t count) {
    if (m_badRows == OxJetBadRows::Fail)
        return fail(message);
    (page ? m_skippedPages : m_skippedRows) += count;
    if (m_firstSkip.empty())
        m_firstSkip = message;
    return true;
}

bool OxJetRowCursor::start() {
    m_started = true;
    m_page.resize(m_file->pageSize());
    m_longPage.resize(m_file->pageSize());
    m_movedPage.resize(m_file->pageSize());
    m_longPageLoaded = false;
    try {
        OxJetUsageMap::Pages pages = OxJetUsageMap::pages(*m_file, m_table->ownedPagesMap);
        m_pages = std::move(pages.pages);
        if (pages.pastEnd > 0 &&
            !skip(oxFormat(L"%u of its data pages lie past the end of the file (truncated file)",
                           pages.pastEnd),
                  true, pages.pastEnd))
            return false;
    } catch (const OxJetError& e) {
        return fail(e.message());
    }
    return true;
}

// Reads the next page that holds rows of this table; false when none is left or on error.
bool OxJetRowCursor::loadPage() {
    while (m_nextPage < m_pages.size()) {
        const uint32_t pg = m_pages[m_nextPage++];
        try {
            m_file->read(pg, m_page.data());
            // A map that marks a page without rows of the table is stale or damaged: counted,
            // since the rows it should hold may be lost.
            if (m_page[0] != kDataPage || OxJetBytes::u32(m_page.data() + 4) != m_table->page) {
                ++m_strayPages;
                continue;
            }
            m_pageRows = m_file->rowCount(m_page.data());
        } catch (const OxJetError& e) {
            if (!skip(e.message(), true))
                return false;
            continue;
        }
        m_nextRow = 0;
        m_pageLoaded = true;
        return true;
    }
    return false;
}

bool OxJetRowCursor::next() {
    if (m_done)
        return false;
    if (!m_started && !start())
        return false;
    for (;;) {
        if (!m_pageLoaded || m_nextRow >= m_pageRows) {
            m_pageLoaded = false;
            if (!loadPage()) {
                m_done = true;
                return false;
            }
        }
        const uint32_t index = m_nextRow++;
        try {
            const OxJetPageFile::Row row = m_file->row(m_page.data(), index);
            // Deleted rows, and rows that only live on as the target of a moved row.
            if (row.flags & OxJetPageFile::kRowDeleted)
                continue;
            if (row.flags & OxJetPageFile::kRowMoved) {
                // The row moved to another page of the table; read it there, in this place.
                uint32_t size = 0;
                const uint8_t* data = movedRow(m_page.data() + row.start, row.size, size);
                decodeRow(data, size);
            } else {
                decodeRow(m_page.data() + row.start, row.size);
            }
        } catch (const OxJetError& e) {
            if (!skip(e.message(), false))
                return false;
            continue;
        } catch (const std::bad_alloc&) {
            if (!skip(L"a value too large for memory", false))
                return false;
            continue;
        }
        ++m_rowsRead;
        return true;
    }
}

const uint8_t* OxJetRowCursor::movedRow(const uint8_t* stub, uint32_t stubSize, uint32_t& size) {
    // A moved row may move again; a few hops are plenty, more means a loop.
    for (int hop = 0; hop < 8; ++hop) {
        if (stubSize < 4)
            bad(L"a moved row's pointer is cut short");
        const uint32_t pointer = OxJetBytes::u32(stub);
        const uint32_t pg = pointer >> 8;
        m_file->read(pg, m_movedPage.data());
        if (m_movedPage[0] != kDataPage || OxJetBytes::u32(m_movedPage.data() + 4) != m_table->page)
            throw OxJetError(oxFormat(
                L"damaged row: a moved row points to page %u, which holds no rows of the table",
                pg));
        const OxJetPageFile::Row row = m_file->row(m_movedPage.data(), pointer & 0xFF);
        const uint8_t* data = m_movedPage.data() + row.start;
        if (!(row.flags & OxJetPageFile::kRowMoved) || (row.flags & OxJetPageFile::kRowDeleted)) {
            size = row.size;
            return data;
        }
        stub = data;
        stubSize = row.size;
        // The next hop reads into the same buffer: keep the pointer before it is replaced.
        m_scratch.assign(stub, stub + std::min<uint32_t>(stubSize, 4));
        stub = m_scratch.data();
    }
    bad(L"a moved row moves too often");
}

void OxJetRowCursor::decodeRow(const uint8_t* r, uint32_t n) {
    // Layout: column count, fixed part, variable part, offsets of the variable columns
    // (last first), their count, and the null mask at the very end.
    const uint32_t countSize = m_jet3 ? 1 : 2;
    if (n < countSize)
        bad(L"too short");
    const uint32_t numCols = m_jet3 ? r[0] : OxJetBytes::u16(r);
    const uint32_t maskSize = (numCols + 7) / 8;
    if (n < countSize + maskSize)
        bad(L"too short for its null mask");
    const uint8_t* mask = r + n - maskSize;
    uint32_t varCount = 0;
    uint32_t offsets[257];
    uint32_t varTableStart = n - maskSize;
    std::vector<uint32_t> heapOffsets;
    uint32_t* off = offsets;
    if (m_hasVarColumns) {
        if (m_jet3) {
            if (n < countSize + maskSize + 1)
                bad(L"too short for its variable columns");
            varCount = r[n - maskSize - 1];
            const uint32_t last = n - 1;
            uint32_t jumps = (n - 1) / 256;
            if (last < maskSize + jumps + 1)
                bad(L"too short for its offset table");
            const uint32_t colPtr = last - maskSize - jumps - 1;
            if (colPtr < varCount + countSize)
                bad(L"offset table overlaps the data");
            if ((colPtr - varCount) / 256 < jumps)
                --jumps;  // the last jump entry is padding
            uint32_t used = 0;
            for (uint32_t i = 0; i <= varCount; ++i) {
                while (used < jumps && i == r[last - maskSize - used - 1]) ++used;
                off[i] = r[colPtr - i] + used * 256;
            }
            varTableStart = colPtr - varCount;
        } else {
            if (n < countSize + maskSize + 2)
                bad(L"too short for its variable columns");
            varCount = OxJetBytes::u16(r + n - maskSize - 2);
            const uint64_t tableBytes = 2ull * (varCount + 1);
            if (tableBytes + maskSize + 2 + countSize > n)
                bad(L"offset table larger than the row");
            const uint32_t tableEnd = n - maskSize - 2;
            if (varCount + 1 > 257) {
                heapOffsets.resize(varCount + 1);
                off = heapOffsets.data();
            }
            for (uint32_t i = 0; i <= varCount; ++i)
                off[i] = OxJetBytes::u16(r + tableEnd - 2 * (i + 1));
            varTableStart = tableEnd - static_cast<uint32_t>(tableBytes);
        }
    }
    const uint32_t fixedEnd = varCount > 0 ? std::min(off[0], varTableStart) : varTableStart;

    for (size_t i = 0; i < m_columns.size(); ++i) {
        const Column& c = m_columns[i];
        OxJetValue& v = m_values[i];
        if (!c.wanted)
            continue;
        const bool present = c.number < numCols && (mask[c.number >> 3] >> (c.number & 7)) & 1;
        if (c.type == OxJetType::Boolean) {
            v.kind = OxJetValue::Boolean;
            v.boolean = present;
            continue;
        }
        if (!c.supported) {
            v.kind = OxJetValue::Unsupported;
            continue;
        }
        if (!present) {
            v.kind = OxJetValue::Null;
            continue;
        }
        if (c.fixed) {
            const uint32_t startAt = countSize + c.fixedOffset;
            if (startAt + c.length > fixedEnd)
                bad(L"a fixed column lies outside the row");
            decodeValue(c, r + startAt, c.length, v);
        } else {
            if (c.varIndex >= varCount) {
                v.kind = OxJetValue::Null;  // added to the table after the row was written
                continue;
            }
            const uint32_t a = off[c.varIndex];
            const uint32_t b = off[c.varIndex + 1];
            if (a > b || b > varTableStart || a < countSize)
                bad(L"a variable column lies outside the row");
            decodeValue(c, r + a, b - a, v);
        }
    }
}

void OxJetRowCursor::decodeValue(const Column& c, const uint8_t* p, uint32_t size, OxJetValue& v) {
    auto need = [&](uint32_t width) {
        if (size < width)
            bad(L"a value is shorter than its type");
    };
    v.kind = c.kind;
    switch (c.type) {
        case OxJetType::Byte:
            need(1);
            v.byte = p[0];
            return;
        case OxJetType::Integer:
            need(2);
            v.integer = static_cast<int16_t>(OxJetBytes::u16(p));
            return;
        case OxJetType::Long:
            need(4);
            v.longValue = static_cast<int32_t>(OxJetBytes::u32(p));
            return;
        case OxJetType::Single:
            need(4);
            v.single = OxJetBytes::f32(p);
            return;
        case OxJetType::Currency:
        case OxJetType::BigInt:
            need(8);
            v.bigInt = static_cast<int64_t>(OxJetBytes::u64(p));
            return;
        case OxJetType::Double:
        case OxJetType::DateTime:
            need(8);
            v.real = OxJetBytes::f64(p);
            return;
        case OxJetType::ReplicationId:
            need(16);
            std::memcpy(v.guid, p, 16);
            return;
        case OxJetType::Numeric:
            need(17);
            v.decimal.negative = (p[0] & 0x80) != 0;
            v.decimal.scale = c.scale;
            for (int w = 0; w < 4; ++w) v.decimal.words[w] = OxJetBytes::u32(p + 1 + 4 * w);
            return;
        case OxJetType::Text:
            m_text.decode(p, size, v.text);
            return;
        case OxJetType::Memo:
            readLongValue(p, size, m_scratch);
            m_text.decode(m_scratch.data(), m_scratch.size(), v.text);
            return;
        case OxJetType::OleObject:
            readLongValue(p, size, v.bytes);
            return;
        default:
            v.bytes.assign(p, p + size);
            return;
    }
}

const uint8_t* OxJetRowCursor::longValueRow(uint32_t pointer, uint32_t& size) {
    const uint32_t pg = pointer >> 8;
    if (!m_longPageLoaded || m_longPageNumber != pg) {
        m_longPageLoaded = false;
        m_file->read(pg, m_longPage.data());
        if (m_longPage[0] != kDataPage)
            throw OxJetError(
                oxFormat(L"damaged row: a long value points to page %u, which is "
                         L"no data page",
                         pg));
        m_longPageNumber = pg;
        m_longPageLoaded = true;
    }
    const OxJetPageFile::Row row = m_file->row(m_longPage.data(), pointer & 0xFF);
    size = row.size;
    return m_longPage.data() + row.start;
}

void OxJetRowCursor::readLongValue(const uint8_t* p, uint32_t size, std::vector<uint8_t>& out) {
    out.clear();
    if (size == 0)
        return;
    if (size < kLongHeader)
        bad(L"a long value's header is cut short");
    const uint32_t word = OxJetBytes::u32(p);
    const uint32_t length = word & kLongLengthMask;
    const uint32_t kind = p[3] & 0xC0;
    if (length > m_file->fileSize())
        bad(L"a long value claims more bytes than the file holds");
    if (kind == kLongInline) {
        if (length > size - kLongHeader)
            bad(L"an inline long value runs past its row");
        out.assign(p + kLongHeader, p + kLongHeader + length);
        return;
    }
    uint32_t pointer = OxJetBytes::u32(p + 4);
    if (kind == kLongSingle) {
        uint32_t rowSize = 0;
        const uint8_t* data = longValueRow(pointer, rowSize);
        if (length > rowSize)
            bad(L"a long value is longer than the row holding it");
        out.assign(data, data + length);
        return;
    }
    if (kind != 0)
        bad(L"a long value has an unknown storage kind");
    // A chain of rows, each starting with the pointer to the next.
    m_chainSeen.clear();
    out.reserve(std::min<uint32_t>(length, 1u << 24));
    while (out.size() < length) {
        if (pointer == 0)
            bad(L"a long value's chain ends early");
        if (!m_chainSeen.insert(pointer).second)
            bad(L"a long value's chain loops");
        uint32_t rowSize = 0;
        const uint8_t* data = longValueRow(pointer, rowSize);
        if (rowSize < 4)
            bad(L"a long value's chain row is cut short");
        pointer = OxJetBytes::u32(data);
        const uint32_t take =
            std::min<uint32_t>(rowSize - 4, length - static_cast<uint32_t>(out.size()));
        out.insert(out.end(), data + 4, data + 4 + take);
    }
}
