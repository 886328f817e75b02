#pragma once

#include <cstdint>
#include <deque>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "platform/workbook/OxWorkbookReader.h"
#include "platform/workbook/OxWorkbookSource.h"

struct zip;
struct zip_file;

// .xlsx (Transitional or Strict): the zip package through libzip, its XML parts through
// expat. Sheet parts are parsed as they are read, so a sheet never sits in memory whole.
class OxXlsxReader : public OxWorkbookReader {
public:
    explicit OxXlsxReader(std::unique_ptr<OxWorkbookSource> source);
    ~OxXlsxReader() override;

    // What the sheet parser needs from the workbook: strings and date formats.
    struct Shared {
        std::string pool;  // UTF-8, end to end
        std::vector<size_t> starts{0};
        std::vector<bool> xfIsDate;
        bool date1904 = false;
    };

protected:
    void doOpen() override;
    void doBeginSheet(size_t index) override;
    bool doNextRow(OxWorkbookRow& row) override;

private:
    struct Rel {
        std::string type;
        std::string target;  // normalised part name
    };
    std::string partKey(const std::string& name) const;
    bool hasPart(const std::string& name) const;
    std::string readPart(const std::string& name, size_t limit) const;
    std::map<std::string, Rel> readRels(const std::string& part) const;
    void closeSheet();

    std::unique_ptr<OxWorkbookSource> m_source;
    zip* m_zip = nullptr;
    std::map<std::string, uint64_t> m_parts;  // lower-case name with '/' -> entry index
    Shared m_shared;
    std::vector<std::string> m_sheetParts;

    // The sheet being read.
    zip_file* m_file = nullptr;
    struct SheetParser;
    std::unique_ptr<SheetParser> m_parser;
};
