#pragma once

#include <cstdint>
#include <memory>
#include <string>

#include "platform/workbook/OxWorkbookError.h"
#include "platform/workbook/OxWorkbookInfo.h"
#include "platform/workbook/OxWorkbookRow.h"

// Reads a workbook (.xls or .xlsx, told apart by content) sheet by sheet and row by row,
// holding no more than the shared parts of the file (strings, formats) and one row.
//   auto r = OxWorkbookReader::open(path, error);
//   r->beginSheet(0); while (r->nextRow(row)) ...; if (r->error()) ...
// No call throws; after a failure error() says why and every later read answers false.
class OxWorkbookReader {
public:
    virtual ~OxWorkbookReader();

    static std::unique_ptr<OxWorkbookReader> open(const std::wstring& path, OxWorkbookError& error);
    static std::unique_ptr<OxWorkbookReader> openMemory(std::string bytes, OxWorkbookError& error);

    const OxWorkbookInfo& info() const { return m_info; }
    size_t sheetCount() const { return m_info.sheets.size(); }
    // Index of the worksheet with that name (case-insensitive), or -1.
    int findSheet(const std::wstring& name) const;

    bool beginSheet(size_t index);
    // The next row holding a non-empty cell; false at the end of the sheet or on failure.
    bool nextRow(OxWorkbookRow& row);
    // Rows and columns up to the last non-empty cell (reads the whole sheet).
    bool sheetExtent(size_t index, uint32_t& rows, uint32_t& columns);

    const OxWorkbookError& error() const { return m_error; }

protected:
    OxWorkbookReader() = default;
    // Implementations throw OxWorkbookError (OxWorkbookError::raise) on failure.
    virtual void doOpen() = 0;
    virtual void doBeginSheet(size_t index) = 0;
    virtual bool doNextRow(OxWorkbookRow& row) = 0;

    OxWorkbookInfo m_info;

private:
    static std::unique_ptr<OxWorkbookReader> create(std::unique_ptr<class OxWorkbookSource> src,
                                                    OxWorkbookError& error);
    template <class F>
    bool guarded(F&& f);

    OxWorkbookError m_error;
    bool m_inSheet = false;
};
