#pragma once

#include <filesystem>
#include <string>
#include <vector>

#include "platform/workbook/OxWorkbookReader.h"

// What the workbook tests share: running programs, and comparing our reading of a file
// with an independent reader's (tests/platform/workbook/oracle.py).
namespace OxWorkbookTest {
struct Run {
    int status = -1;
    std::string out;
};
// Runs argv[0] with the arguments, standard output captured, standard error dropped.
Run run(const std::vector<std::string>& argv);

struct OracleCell {
    size_t sheet;
    uint32_t row, col;
    char kind;  // n s b e d t (see oracle.py)
    std::string value;
};
struct Oracle {
    bool ok = false;
    std::string reader;
    std::vector<std::pair<std::string, std::string>> sheets;  // visibility, name
    std::vector<OracleCell> cells;
};
// reader: empty for the usual order (xlrd or openpyxl, then ssconvert, then soffice).
Oracle oracle(const std::filesystem::path& file, const std::string& reader = {});

// Differences between our reading of the file and the oracle's, one line each.
std::vector<std::string> compare(const std::filesystem::path& file, const Oracle& oracle);

// A compound file holding a workbook stream made of raw records, for malformed input.
std::string compoundFile(const std::string& stream, const std::wstring& name = L"Workbook");
// A record: type, size and data.
std::string record(uint16_t type, const std::string& data);
std::string le16(uint32_t v);
std::string le32(uint32_t v);
}  // namespace OxWorkbookTest
