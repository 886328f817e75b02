#pragma once

#include <cstdint>
#include <string>
#include <vector>

// What a reader knows about a workbook before reading any cells.
struct OxWorkbookSheetInfo {
    enum Visibility : uint8_t { Visible = 0, Hidden = 1, VeryHidden = 2 };
    std::wstring name;
    Visibility visibility = Visible;
};

struct OxWorkbookDefinedName {
    std::wstring name;
    std::wstring formula;  // "'Sheet 1'!$A$1:$B$9"; empty when the reader cannot render it
    int sheet = -1;        // the worksheet it belongs to, -1 for a workbook-wide name
    bool hidden = false;
};

struct OxWorkbookInfo {
    enum Format : uint8_t { Xls = 0, Xlsx = 1 };
    Format format = Xls;
    int biffVersion = 0;                      // 5 or 8 for .xls, 0 for .xlsx
    bool date1904 = false;                    // serials count from 1904-01-01
    std::vector<OxWorkbookSheetInfo> sheets;  // worksheets only, in tab order
    std::vector<OxWorkbookDefinedName> names;
};
