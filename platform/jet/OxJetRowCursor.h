#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <unordered_set>
#include <vector>

#include "platform/jet/OxJetSchema.h"
#include "platform/jet/OxJetText.h"
#include "platform/jet/OxJetValue.h"

class OxJetPageFile;

// What a cursor does with a row it cannot decode: stop with an error (the default), or
// skip it and count it (skippedRows, firstSkipReason). Rows are never dropped unseen.
enum class OxJetBadRows : uint8_t { Fail, Skip };

// Streams the rows of one table in the file's page order, each value decoded by type.
// Single-threaded; several cursors over one file may run on different threads.
class OxJetRowCursor {
public:
    OxJetRowCursor(std::shared_ptr<const OxJetPageFile> file,
                   std::shared_ptr<const OxJetTableDef> table, uint16_t codePage,
                   OxJetBadRows badRows);
    ~OxJetRowCursor();
    OxJetRowCursor(const OxJetRowCursor&) = delete;
    OxJetRowCursor& operator=(const OxJetRowCursor&) = delete;

    // Moves to the next row; false at the end and on an error (failed() tells them apart).
    bool next();
    // Back before the first row; clears an error.
    void rewind();

    const OxJetTableDef& table() const { return *m_table; }
    const std::vector<OxJetValue>& values() const { return m_values; }
    const OxJetValue& value(size_t column) const { return m_values[column]; }

    // Decodes only the columns marked true (by position in the table's columns); the others
    // stay Null. An empty list reads every column.
    void selectColumns(const std::vector<bool>& wanted);

    bool failed() const { return !m_error.empty(); }
    const std::wstring& error() const { return m_error; }
    uint64_t rowsRead() const { return m_rowsRead; }
    uint64_t skippedRows() const { return m_skippedRows; }
    uint64_t skippedPages() const { return m_skippedPages; }
    const std::wstring& firstSkipReason() const { return m_firstSkip; }
    // Pages the table's map marks that hold none of its rows: a stale map, or damage that
    // may have cost rows. Reported, not an error: the file gives no way to tell.
    uint64_t strayPages() const { return m_strayPages; }

private:
    struct Column;
    bool start();
    bool loadPage();
    void decodeRow(const uint8_t* row, uint32_t size);
    void decodeValue(const Column& c, const uint8_t* p, uint32_t size, OxJetValue& out);
    void readLongValue(const uint8_t* p, uint32_t size, std::vector<uint8_t>& out);
    const uint8_t* longValueRow(uint32_t pointer, uint32_t& size);
    const uint8_t* movedRow(const uint8_t* stub, uint32_t stubSize, uint32_t& size);
    bool fail(const std::wstring& message);
    bool skip(const std::wstring& message, bool page, uint64_t count = 1);

    std::shared_ptr<const OxJetPageFile> m_file;
    std::shared_ptr<const OxJetTableDef> m_table;
    OxJetText m_text;
    OxJetBadRows m_badRows;
    std::vector<Column> m_columns;
    std::vector<OxJetValue> m_values;
    bool m_jet3;
    bool m_hasVarColumns = false;

    bool m_started = false;
    bool m_done = false;
    std::vector<uint32_t> m_pages;
    size_t m_nextPage = 0;
    std::vector<uint8_t> m_page;
    uint32_t m_pageRows = 0;
    uint32_t m_nextRow = 0;
    bool m_pageLoaded = false;

    std::vector<uint8_t> m_movedPage;
    std::vector<uint8_t> m_longPage;
    uint32_t m_longPageNumber = 0;
    bool m_longPageLoaded = false;
    std::vector<uint8_t> m_scratch;
    std::unordered_set<uint32_t> m_chainSeen;

    std::wstring m_error;
    std::wstring m_firstSkip;
    uint64_t m_rowsRead = 0;
    uint64_t m_skippedRows = 0;
    uint64_t m_skippedPages = 0;
    uint64_t m_strayPages = 0;
};
