#pragma once

#include <string>
#include <vector>

#include "platform/workbook/OxWorkbookError.h"
#include "platform/workbook/OxWorkbookInfo.h"
#include "platform/workbook/OxWorkbookSheet.h"

// A whole workbook in memory, for callers that edit and write back; large files are
// better read and written through OxWorkbookReader and OxWorkbookWriter directly.
class OxWorkbook {
public:
    bool date1904 = false;
    std::vector<OxWorkbookSheet> sheets;
    std::vector<OxWorkbookDefinedName> names;

    static bool load(const std::wstring& path, OxWorkbook& out, OxWorkbookError& error);
    // Writes every sheet (names are not written). Dates of a 1904 workbook are moved to
    // the 1900 system the writers use, so they show the same days.
    bool save(const std::wstring& path, OxWorkbookInfo::Format format,
              OxWorkbookError& error) const;

    // Index of a sheet by name (case-insensitive), or -1.
    int findSheet(const std::wstring& name) const;
};
