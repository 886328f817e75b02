#pragma once

#include <cstdint>
#include <vector>

#include "platform/workbook/OxWorkbookInfo.h"
#include "platform/workbook/OxWorkbookRow.h"

// One worksheet held in memory: its rows (ascending, non-empty ones only) and cells.
class OxWorkbookSheet {
public:
    OxWorkbookSheetInfo info;
    std::vector<OxWorkbookRow> rows;

    // The cell at a position, or null when it is empty.
    const OxWorkbookCell* cell(uint32_t row, uint32_t column) const;
    // Sets (or, with an Empty cell, clears) the cell at row and cell.column.
    void setCell(uint32_t row, OxWorkbookCell cell);
    // Adds a row read from a file, merging it with an earlier row of the same index.
    void addRow(OxWorkbookRow row);

    uint32_t rowCount() const;     // last non-empty row + 1
    uint32_t columnCount() const;  // last non-empty column + 1
};
