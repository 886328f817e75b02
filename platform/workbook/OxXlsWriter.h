#pragma once

#include <cstdint>
#include <cstdio>
#include <string>
#include <unordered_map>
#include <vector>

#include "platform/workbook/OxWorkbookOutputFile.h"
#include "platform/workbook/OxWorkbookWriter.h"

// .xls (BIFF8 in a compound file), written by this code. Sheet records go to an unnamed
// scratch file as rows arrive; the globals (which hold the shared strings and the sheets'
// offsets) are built at commit, then everything is copied into the new file.
class OxXlsWriter : public OxWorkbookWriter {
public:
    OxXlsWriter();
    ~OxXlsWriter() override;

protected:
    void doCreate(const std::wstring& path) override;
    void doAddSheet(const std::wstring& name, OxWorkbookSheetInfo::Visibility v) override;
    void doWriteRow(const OxWorkbookRow& row) override;
    void doCommit() override;
    void doAbandon() noexcept override;

private:
    struct Sheet {
        uint64_t start = 0;  // offset of its BOF in the scratch file
        uint64_t dimensions = 0;
        uint64_t window = 0;  // its WINDOW2 record, marked selected at commit if active
        uint32_t rows = 0;
        uint32_t firstRow = UINT32_MAX;
        uint32_t firstCol = UINT32_MAX;
        uint32_t lastCol = 0;
        bool hasCells = false;
    };
    void scratch(const std::string& bytes);
    void patchScratch(uint64_t offset, const std::string& bytes);
    void flushBlock();
    void finishSheet();
    uint32_t stringIndex(const std::wstring& text);
    std::string globals(const std::vector<uint32_t>& sheetOffsets) const;

    OxWorkbookOutputFile m_out;
    std::FILE* m_scratch = nullptr;
    uint64_t m_scratchSize = 0;
    std::vector<Sheet> m_sheetData;
    bool m_sheetOpen = false;

    // Rows of the current block of 32: ROW records precede their cells.
    std::vector<std::string> m_blockRows;
    std::string m_blockCells;
    uint32_t m_block = UINT32_MAX;

    std::unordered_map<std::wstring, uint32_t> m_sst;
    std::vector<const std::wstring*> m_sstOrder;
    uint64_t m_sstTotal = 0;
};
