#include "platform/workbook/OxWorkbook.h"

#include "platform/core/OxText.h"
#include "platform/workbook/OxWorkbookReader.h"
#include "platform/workbook/OxWorkbookWriter.h"

bool OxWorkbook::load(const std::wstring& path, OxWorkbook& out, OxWorkbookError& error) {
    auto reader = OxWorkbookReader::open(path, error);
    if (!reader)
        return false;
    OxWorkbook wb;
    wb.date1904 = reader->info().date1904;
    wb.names = reader->info().names;
    OxWorkbookRow row;
    for (size_t i = 0; i < reader->sheetCount(); ++i) {
        OxWorkbookSheet sheet;
        sheet.info = reader->info().sheets[i];
        reader->beginSheet(i);
        while (reader->nextRow(row)) sheet.addRow(std::move(row));
        if (reader->error()) {
            error = reader->error();
            return false;
        }
        wb.sheets.push_back(std::move(sheet));
    }
    out = std::move(wb);
    return true;
}

bool OxWorkbook::save(const std::wstring& path, OxWorkbookInfo::Format format,
                      OxWorkbookError& error) const {
    auto writer = OxWorkbookWriter::create(path, format, error);
    if (!writer)
        return false;
    for (const auto& sheet : sheets) {
        bool ok = writer->addSheet(sheet.info.name, sheet.info.visibility);
        for (size_t r = 0; ok && r < sheet.rows.size(); ++r) {
            if (!date1904) {
                ok = writer->writeRow(sheet.rows[r]);
                continue;
            }
            OxWorkbookRow moved = sheet.rows[r];
            for (auto& c : moved.cells) {
                double platform = 0, serial = 0;
                if (c.type == OxWorkbookCell::Date &&
                    OxWorkbookCell::workbookToPlatformSerial(c.number, true, platform) &&
                    OxWorkbookCell::platformToWorkbookSerial(platform, false, serial))
                    c.number = serial;
                else if (c.type == OxWorkbookCell::Date)
                    c.type = OxWorkbookCell::Number;
            }
            ok = writer->writeRow(moved);
        }
        if (!ok)
            break;
    }
    if (!writer->error() && writer->commit())
        return true;
    error = writer->error();
    return false;
}

int OxWorkbook::findSheet(const std::wstring& name) const {
    for (size_t i = 0; i < sheets.size(); ++i)
        if (OxText::equalsNoCase(sheets[i].info.name, name))
            return static_cast<int>(i);
    return -1;
}
