#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "platform/core/OxVariant.h"

struct sqlite3_stmt;

enum class OxQelSQLiteKind : uint8_t { Null, Integer, Real, Text, Blob };

// One value as the engine keeps it; a text in the store's encoding.
struct OxQelSQLiteCell {
    union {
        int64_t i;
        double d;
        const void* p;
    };
    uint32_t size;  // bytes of a text or blob
    OxQelSQLiteKind kind;
};

// The rows of a loaded result, kept as the engine gave them: 16 bytes a cell, texts and
// blobs packed into large blocks, texts in the database's own encoding. A variant is
// made only when a value is read, so a large result costs little more memory than its
// data and loads without one allocation per cell.
class OxQelSQLiteRowStore {
public:
    using Kind = OxQelSQLiteKind;
    using Cell = OxQelSQLiteCell;

    // Empties the store for rows of that many columns; texts in UTF-16 or UTF-8.
    void reset(int columns, bool utf16);
    size_t rowCount() const { return m_rowCount; }
    int columnCount() const { return m_columns; }
    bool utf16() const { return m_utf16; }

    // Appends the statement's current row.
    void appendRow(sqlite3_stmt* stmt);
    // Appends a row of the given cells (copied).
    void appendRow(const std::vector<Cell>& cells);

    const Cell& cell(size_t row, int column) const { return cellAt(index(row, column)); }
    void setCell(size_t row, int column, const Cell& value);
    OxVariant value(size_t row, int column) const;

    // Cells whose bytes live in the store, for values that did not come from the engine.
    Cell makeNull() const;
    Cell makeInteger(int64_t value) const;
    Cell makeReal(double value) const;
    Cell makeText(std::wstring_view text);
    Cell makeBlob(const void* data, size_t size);

    // Binds the cell to a parameter of a statement; the store must outlive the binding.
    int bind(sqlite3_stmt* stmt, int parameter, const Cell& value) const;

private:
    static constexpr size_t kCellsPerBlock = size_t(1) << 14;
    static constexpr size_t kBytesPerChunk = size_t(1) << 20;

    size_t index(size_t row, int column) const {
        return row * static_cast<size_t>(m_columns) + static_cast<size_t>(column);
    }
    Cell& cellAt(size_t i) const { return m_cellBlocks[i / kCellsPerBlock][i % kCellsPerBlock]; }
    Cell& nextCell();
    const void* copyBytes(const void* data, size_t size);

    int m_columns = 0;
    bool m_utf16 = false;
    size_t m_rowCount = 0;
    size_t m_cellCount = 0;
    std::vector<std::unique_ptr<Cell[]>> m_cellBlocks;
    std::vector<std::unique_ptr<char[]>> m_chunks;
    char* m_free = nullptr;
    size_t m_freeSize = 0;
    mutable std::wstring m_scratch;
    std::string m_encoded;
};

static_assert(sizeof(OxQelSQLiteCell) == 16, "a cell stays small");
