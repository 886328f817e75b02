#include "platform/workbook/OxWorkbookSheet.h"

#include <algorithm>

namespace {
bool rowBefore(const OxWorkbookRow& r, uint32_t index) {
    return r.index < index;
}
bool cellBefore(const OxWorkbookCell& c, uint32_t column) {
    return c.column < column;
}
}  // namespace

const OxWorkbookCell* OxWorkbookSheet::cell(uint32_t row, uint32_t column) const {
    const auto r = std::lower_bound(rows.begin(), rows.end(), row, rowBefore);
    if (r == rows.end() || r->index != row)
        return nullptr;
    const auto c = std::lower_bound(r->cells.begin(), r->cells.end(), column, cellBefore);
    return c == r->cells.end() || c->column != column ? nullptr : &*c;
}

void OxWorkbookSheet::setCell(uint32_t row, OxWorkbookCell cell) {
    auto r = std::lower_bound(rows.begin(), rows.end(), row, rowBefore);
    if (r == rows.end() || r->index != row) {
        if (cell.type == OxWorkbookCell::Empty)
            return;
        r = rows.insert(r, OxWorkbookRow{row, {}});
    }
    auto& cells = r->cells;
    const auto c = std::lower_bound(cells.begin(), cells.end(), cell.column, cellBefore);
    const bool exists = c != cells.end() && c->column == cell.column;
    if (cell.type == OxWorkbookCell::Empty) {
        if (exists)
            cells.erase(c);
        if (cells.empty())
            rows.erase(r);
    } else if (exists) {
        *c = std::move(cell);
    } else {
        cells.insert(c, std::move(cell));
    }
}

void OxWorkbookSheet::addRow(OxWorkbookRow row) {
    if (row.cells.empty())
        return;
    if (rows.empty() || rows.back().index < row.index) {
        rows.push_back(std::move(row));
        return;
    }
    for (auto& c : row.cells) setCell(row.index, std::move(c));
}

uint32_t OxWorkbookSheet::rowCount() const {
    return rows.empty() ? 0 : rows.back().index + 1;
}

uint32_t OxWorkbookSheet::columnCount() const {
    uint32_t n = 0;
    for (const auto& r : rows)
        if (!r.cells.empty())
            n = std::max(n, r.cells.back().column + 1);
    return n;
}
