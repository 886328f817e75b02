// The .xlsx reader's XML parts under fuzzing. Deflated zips rarely survive mutation, so
// the input is the parts themselves, separated by NUL bytes (sheet, shared strings,
// styles, workbook), packed here into a zip of stored entries.
#include <zlib.h>

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "platform/workbook/OxWorkbookReader.h"

namespace {
void put16(std::string& s, uint32_t v) {
    s.push_back(static_cast<char>(v & 0xFF));
    s.push_back(static_cast<char>((v >> 8) & 0xFF));
}
void put32(std::string& s, uint32_t v) {
    put16(s, v & 0xFFFF);
    put16(s, v >> 16);
}

std::string storedZip(const std::vector<std::pair<std::string, std::string>>& parts) {
    std::string zip, dir;
    for (const auto& [name, data] : parts) {
        const uint32_t crc = static_cast<uint32_t>(
            crc32(0, reinterpret_cast<const Bytef*>(data.data()), static_cast<uInt>(data.size())));
        const uint32_t offset = static_cast<uint32_t>(zip.size());
        std::string common;
        put16(common, 20);
        put16(common, 0);
        put16(common, 0);  // stored
        put32(common, 0);
        put32(common, crc);
        put32(common, static_cast<uint32_t>(data.size()));
        put32(common, static_cast<uint32_t>(data.size()));
        put16(common, static_cast<uint32_t>(name.size()));
        put16(common, 0);
        put32(zip, 0x04034b50);
        zip += common + name + data;
        put32(dir, 0x02014b50);
        put16(dir, 20);
        dir += common;
        put16(dir, 0);
        put16(dir, 0);
        put16(dir, 0);
        put32(dir, 0);
        put32(dir, offset);
        dir += name;
    }
    const uint32_t start = static_cast<uint32_t>(zip.size());
    zip += dir;
    put32(zip, 0x06054b50);
    put32(zip, 0);
    put16(zip, static_cast<uint32_t>(parts.size()));
    put16(zip, static_cast<uint32_t>(parts.size()));
    put32(zip, static_cast<uint32_t>(dir.size()));
    put32(zip, start);
    put16(zip, 0);
    return zip;
}

const char* const kDefaults[] = {
    "<worksheet><sheetData/></worksheet>",
    "<sst/>",
    "<styleSheet/>",
    ("<workbook xmlns:r=\"http://schemas.openxmlformats.org/officeDocument/2006/relationships\">"
     "<sheets><sheet name=\"S\" sheetId=\"1\" r:id=\"rId1\"/></sheets></workbook>"),
};
}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    std::vector<std::string> parts;
    std::string current;
    for (size_t i = 0; i < size; ++i) {
        if (data[i] == 0 && parts.size() < 3) {
            parts.push_back(current);
            current.clear();
        } else {
            current.push_back(static_cast<char>(data[i]));
        }
    }
    parts.push_back(current);
    for (size_t i = parts.size(); i < 4; ++i) parts.push_back(kDefaults[i]);
    const std::string rel = "http://schemas.openxmlformats.org/officeDocument/2006/relationships/";
    const std::string rels =
        "<Relationships><Relationship Id=\"rId1\" Type=\"" + rel +
        "worksheet\" Target=\"worksheets/sheet1.xml\"/><Relationship Id=\"rId2\" Type=\"" + rel +
        "sharedStrings\" Target=\"sharedStrings.xml\"/><Relationship Id=\"rId3\" Type=\"" + rel +
        "styles\" Target=\"styles.xml\"/></Relationships>";
    const std::string zip = storedZip({
        {"_rels/.rels", "<Relationships><Relationship Id=\"rId1\" Type=\"" + rel +
                            "officeDocument\" Target=\"xl/workbook.xml\"/></Relationships>"},
        {"xl/_rels/workbook.xml.rels", rels},
        {"xl/workbook.xml", parts[3]},
        {"xl/worksheets/sheet1.xml", parts[0]},
        {"xl/sharedStrings.xml", parts[1]},
        {"xl/styles.xml", parts[2]},
    });
    OxWorkbookError error;
    auto reader = OxWorkbookReader::openMemory(zip, error);
    if (!reader)
        return 0;
    OxWorkbookRow row;
    for (size_t i = 0; i < reader->sheetCount(); ++i)
        if (reader->beginSheet(i))
            while (reader->nextRow(row)) {
            }
    return 0;
}
