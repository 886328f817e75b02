#include "OxQelLib/sqlite/OxQelSQLiteRowStore.h"

#include <sqlite3.h>

#include <cstring>

#include "platform/core/OxText.h"

namespace {
// Zero-length values still need a pointer: the engine binds a null pointer as NULL.
const char kEmpty[2] = {0, 0};
}  // namespace

void OxQelSQLiteRowStore::reset(int columns, bool utf16) {
    m_columns = columns < 0 ? 0 : columns;
    m_utf16 = utf16;
    m_rowCount = 0;
    m_cellCount = 0;
    m_cellBlocks.clear();
    m_chunks.clear();
    m_free = nullptr;
    m_freeSize = 0;
    m_scratch = std::wstring();
    m_encoded = std::string();
}

OxQelSQLiteRowStore::Cell& OxQelSQLiteRowStore::nextCell() {
    if (m_cellCount == m_cellBlocks.size() * kCellsPerBlock)
        m_cellBlocks.emplace_back(new Cell[kCellsPerBlock]);
    return cellAt(m_cellCount++);
}

const void* OxQelSQLiteRowStore::copyBytes(const void* data, size_t size) {
    if (size == 0)
        return kEmpty;
    // Even offsets keep UTF-16 texts aligned.
    const size_t needed = (size + 1) & ~size_t(1);
    if (needed > kBytesPerChunk / 16) {
        // A large value gets a block of its own, so the current one is not wasted.
        m_chunks.emplace_back(new char[needed]);
        std::memcpy(m_chunks.back().get(), data, size);
        return m_chunks.back().get();
    }
    if (needed > m_freeSize) {
        m_chunks.emplace_back(new char[kBytesPerChunk]);
        m_free = m_chunks.back().get();
        m_freeSize = kBytesPerChunk;
    }
    char* out = m_free;
    std::memcpy(out, data, size);
    m_free += needed;
    m_freeSize -= needed;
    return out;
}

void OxQelSQLiteRowStore::appendRow(sqlite3_stmt* stmt) {
    for (int c = 0; c < m_columns; ++c) {
        Cell& cell = nextCell();
        cell.size = 0;
        switch (sqlite3_column_type(stmt, c)) {
            case SQLITE_INTEGER:
                cell.kind = Kind::Integer;
                cell.i = sqlite3_column_int64(stmt, c);
                break;
            case SQLITE_FLOAT:
                cell.kind = Kind::Real;
                cell.d = sqlite3_column_double(stmt, c);
                break;
            case SQLITE_TEXT: {
                const void* text =
                    m_utf16 ? sqlite3_column_text16(stmt, c) : sqlite3_column_text(stmt, c);
                const int bytes =
                    m_utf16 ? sqlite3_column_bytes16(stmt, c) : sqlite3_column_bytes(stmt, c);
                cell.kind = Kind::Text;
                cell.size = static_cast<uint32_t>(bytes);
                cell.p = copyBytes(text, static_cast<size_t>(bytes));
                break;
            }
            case SQLITE_BLOB: {
                const void* data = sqlite3_column_blob(stmt, c);
                const int bytes = sqlite3_column_bytes(stmt, c);
                cell.kind = Kind::Blob;
                cell.size = static_cast<uint32_t>(bytes);
                cell.p = copyBytes(data, static_cast<size_t>(bytes));
                break;
            }
            default:
                cell.kind = Kind::Null;
                cell.i = 0;
                break;
        }
    }
    ++m_rowCount;
}

void OxQelSQLiteRowStore::appendRow(const std::vector<Cell>& cells) {
    for (int c = 0; c < m_columns; ++c) {
        Cell& cell = nextCell();
        cell = static_cast<size_t>(c) < cells.size() ? cells[static_cast<size_t>(c)] : makeNull();
    }
    ++m_rowCount;
}

void OxQelSQLiteRowStore::setCell(size_t row, int column, const Cell& value) {
    cellAt(index(row, column)) = value;
}

OxVariant OxQelSQLiteRowStore::value(size_t row, int column) const {
    const Cell& c = cell(row, column);
    switch (c.kind) {
        case Kind::Integer:
            // Values that fit keep the 32-bit form callers always saw.
            if (c.i >= INT32_MIN && c.i <= INT32_MAX)
                return OxVariant::fromInt(static_cast<int32_t>(c.i));
            return OxVariant(static_cast<long long>(c.i));
        case Kind::Real:
            return OxVariant(c.d);
        case Kind::Text: {
            // The scratch buffer only grows: reading a text allocates only its variant.
            const size_t units = m_utf16 ? c.size / 2 : c.size;
            if (m_scratch.size() < units)
                m_scratch.resize(units);
            const size_t length =
                m_utf16 ? OxText::decodeUtf16(
                              std::u16string_view(static_cast<const char16_t*>(c.p), units),
                              m_scratch.data())
                        : OxText::decodeUtf8(std::string_view(static_cast<const char*>(c.p), units),
                                             m_scratch.data());
            return OxVariant(std::wstring_view(m_scratch.data(), length));
        }
        case Kind::Blob:
            return OxVariant::fromBytes(c.p, c.size);
        default:
            return OxVariant::null();
    }
}

OxQelSQLiteRowStore::Cell OxQelSQLiteRowStore::makeNull() const {
    Cell c;
    c.i = 0;
    c.size = 0;
    c.kind = Kind::Null;
    return c;
}

OxQelSQLiteRowStore::Cell OxQelSQLiteRowStore::makeInteger(int64_t value) const {
    Cell c = makeNull();
    c.kind = Kind::Integer;
    c.i = value;
    return c;
}

OxQelSQLiteRowStore::Cell OxQelSQLiteRowStore::makeReal(double value) const {
    Cell c = makeNull();
    c.kind = Kind::Real;
    c.d = value;
    return c;
}

OxQelSQLiteRowStore::Cell OxQelSQLiteRowStore::makeText(std::wstring_view text) {
    Cell c = makeNull();
    c.kind = Kind::Text;
    if (m_utf16) {
        std::u16string units;
        OxText::appendUtf16(units, text);
        c.size = static_cast<uint32_t>(units.size() * 2);
        c.p = copyBytes(units.data(), c.size);
    } else {
        m_encoded.clear();
        OxText::appendUtf8(m_encoded, text);
        c.size = static_cast<uint32_t>(m_encoded.size());
        c.p = copyBytes(m_encoded.data(), c.size);
    }
    return c;
}

OxQelSQLiteRowStore::Cell OxQelSQLiteRowStore::makeBlob(const void* data, size_t size) {
    Cell c = makeNull();
    c.kind = Kind::Blob;
    c.size = static_cast<uint32_t>(size);
    c.p = copyBytes(data, size);
    return c;
}

int OxQelSQLiteRowStore::bind(sqlite3_stmt* stmt, int parameter, const Cell& value) const {
    switch (value.kind) {
        case Kind::Integer:
            return sqlite3_bind_int64(stmt, parameter, value.i);
        case Kind::Real:
            return sqlite3_bind_double(stmt, parameter, value.d);
        case Kind::Text:
            return m_utf16 ? sqlite3_bind_text16(stmt, parameter, value.p,
                                                 static_cast<int>(value.size), SQLITE_STATIC)
                           : sqlite3_bind_text(stmt, parameter, static_cast<const char*>(value.p),
                                               static_cast<int>(value.size), SQLITE_STATIC);
        case Kind::Blob:
            return sqlite3_bind_blob(stmt, parameter, value.p, static_cast<int>(value.size),
                                     SQLITE_STATIC);
        default:
            return sqlite3_bind_null(stmt, parameter);
    }
}
