#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "platform/workbook/OxWorkbookCodepage.h"
#include "platform/workbook/OxWorkbookReader.h"
#include "platform/workbook/OxWorkbookSource.h"

// .xls: BIFF8 (and BIFF5) workbook streams in a compound file. The workbook stream is
// read into memory once; cells are decoded from it row by row.
class OxXlsReader : public OxWorkbookReader {
public:
    explicit OxXlsReader(std::unique_ptr<OxWorkbookSource> source);
    ~OxXlsReader() override;

    // Stream offsets of the workbook's pieces, for tests of odd files.
    struct Segment {
        size_t offset;
        size_t size;
    };

protected:
    void doOpen() override;
    void doBeginSheet(size_t index) override;
    bool doNextRow(OxWorkbookRow& row) override;

private:
    struct Record {
        uint16_t type;
        uint16_t size;
        size_t offset;  // of the data, in m_stream
    };
    struct Sheet {
        size_t start;  // offset of its BOF
    };
    bool readRecord(size_t pos, Record& rec, bool strict = true) const;
    std::vector<Segment> continued(const Record& first, size_t& next) const;
    void parseGlobals();
    void parseSst(const std::vector<Segment>& segments);
    void parseName(const Record& rec, std::vector<std::wstring>& allSheetNames);
    void readByteString(const char* p, size_t avail, size_t lenBytes, std::wstring& out) const;
    void readUnicodeString(const std::vector<Segment>& segments, size_t lenBytes,
                           std::wstring& out) const;
    bool isDateXf(uint16_t xf) const { return xf < m_xfIsDate.size() && m_xfIsDate[xf]; }
    OxWorkbookCell numberCell(uint32_t col, uint16_t xf, double value) const;
    // Adds the cell to the row being gathered; true when that finished the previous row,
    // which is then in out.
    bool addCell(uint32_t row, OxWorkbookCell&& cell, OxWorkbookRow& out);
    void finishRow(OxWorkbookRow& out);

    std::unique_ptr<OxWorkbookSource> m_source;
    std::string m_stream;
    int m_biff = 8;
    OxWorkbookCodepage* m_codepage = nullptr;
    std::unique_ptr<OxWorkbookCodepage> m_codepageOwner;
    std::vector<bool> m_xfIsDate;
    std::string m_sstPool;           // the shared strings as UTF-8, end to end: compact
    std::vector<size_t> m_sstStart;  // n+1 offsets into m_sstPool
    std::vector<Sheet> m_sheets;

    // Reading position in the current sheet.
    size_t m_pos = 0;
    size_t m_end = 0;
    int m_depth = 0;
    bool m_pendingString = false;
    uint32_t m_pendingRow = 0;
    uint32_t m_pendingCol = 0;
    bool m_haveRow = false;
    bool m_sorted = true;
    bool m_sheetDone = false;
    size_t m_rowText = 0;
    OxWorkbookRow m_row;
};
