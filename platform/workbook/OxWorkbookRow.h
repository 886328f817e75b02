#pragma once

#include <cstdint>
#include <vector>

#include "platform/workbook/OxWorkbookCell.h"

// The non-empty cells of one row (zero-based index), in ascending column order.
struct OxWorkbookRow {
    uint32_t index = 0;
    std::vector<OxWorkbookCell> cells;
};
