// Feeds arbitrary bytes to the workbook reader and reads every sheet to the end.
#include <cstddef>
#include <cstdint>
#include <string>

#include "platform/workbook/OxWorkbookReader.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    OxWorkbookError error;
    auto reader =
        OxWorkbookReader::openMemory(std::string(reinterpret_cast<const char*>(data), size), error);
    if (!reader)
        return 0;
    OxWorkbookRow row;
    for (size_t i = 0; i < reader->sheetCount(); ++i) {
        if (!reader->beginSheet(i))
            continue;
        while (reader->nextRow(row)) {
        }
    }
    return 0;
}
