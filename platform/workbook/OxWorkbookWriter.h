#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "platform/workbook/OxWorkbookError.h"
#include "platform/workbook/OxWorkbookInfo.h"
#include "platform/workbook/OxWorkbookRow.h"

// Writes a new workbook sheet by sheet, rows in ascending order:
//   auto w = OxWorkbookWriter::create(path, OxWorkbookInfo::Xlsx, error);
//   w->addSheet(L"Data"); w->writeRow(row); ...; w->commit();
// The file appears under its name only when commit() succeeds; a writer dropped before
// that, or after any failure, leaves the target as it was. No call throws. Date cells hold
// serials of the 1900 date system; one that system cannot show is written as a number.
class OxWorkbookWriter {
public:
    virtual ~OxWorkbookWriter();

    static std::unique_ptr<OxWorkbookWriter> create(const std::wstring& path,
                                                    OxWorkbookInfo::Format format,
                                                    OxWorkbookError& error);
    // .xls or .xlsx by the path's extension (any case); false for others.
    static bool formatFromPath(const std::wstring& path, OxWorkbookInfo::Format& format);

    // A name a sheet may have: 1-31 characters, none of : \ / ? * [ ], no apostrophe
    // at either end, not taken (case-insensitively) by another sheet.
    static bool checkSheetName(const std::wstring& name, const std::vector<std::wstring>& taken,
                               OxWorkbookError& error);

    bool addSheet(const std::wstring& name,
                  OxWorkbookSheetInfo::Visibility visibility = OxWorkbookSheetInfo::Visible);
    // Cells in ascending column order; Empty cells are skipped.
    bool writeRow(const OxWorkbookRow& row);
    bool commit();

    const OxWorkbookError& error() const { return m_error; }
    uint32_t maxRows() const { return m_maxRows; }
    uint32_t maxColumns() const { return m_maxColumns; }

    // Cell texts are limited to this many UTF-16 code units by both formats.
    static constexpr size_t kMaxTextLength = 32767;

protected:
    OxWorkbookWriter(uint32_t maxRows, uint32_t maxColumns)
        : m_maxRows(maxRows), m_maxColumns(maxColumns) {}
    // Implementations throw OxWorkbookError (OxWorkbookError::raise) on failure.
    virtual void doCreate(const std::wstring& path) = 0;
    virtual void doAddSheet(const std::wstring& name, OxWorkbookSheetInfo::Visibility v) = 0;
    virtual void doWriteRow(const OxWorkbookRow& row) = 0;
    virtual void doCommit() = 0;
    // Drops the unfinished file after a failure.
    virtual void doAbandon() noexcept = 0;

    // Index of the sheet a workbook opens on: the first visible one.
    size_t activeSheet() const;
    std::vector<OxWorkbookSheetInfo> m_sheets;

private:
    template <class F>
    bool guarded(F&& f);
    void check(const OxWorkbookRow& row) const;

    uint32_t m_maxRows;
    uint32_t m_maxColumns;
    OxWorkbookError m_error;
    bool m_done = false;
    bool m_rowWritten = false;
    uint32_t m_lastRow = 0;
};
