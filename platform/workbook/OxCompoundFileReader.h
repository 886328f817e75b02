#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "platform/workbook/OxWorkbookError.h"
#include "platform/workbook/OxWorkbookSource.h"

// Reads streams out of a compound file (the container of .xls and of encrypted .xlsx).
// Every chain is bounded by the file's sector count, so loops and wild sector numbers in
// a damaged file end in an error instead of a hang or a huge allocation.
class OxCompoundFileReader {
public:
    bool open(const OxWorkbookSource& source, OxWorkbookError& error);

    // Streams directly below the root storage, by name.
    const std::vector<std::wstring>& rootStreams() const { return m_rootStreamNames; }
    // Case-insensitive, as the container compares names.
    bool hasRootStream(const std::wstring& name) const;
    bool readRootStream(const std::wstring& name, std::string& out, OxWorkbookError& error) const;

private:
    struct Entry {
        std::wstring name;
        uint8_t type = 0;
        uint32_t left = 0, right = 0, child = 0;
        uint32_t start = 0;
        uint64_t size = 0;
    };
    bool readSector(uint32_t sector, char* out, OxWorkbookError& error) const;
    bool chain(const std::vector<uint32_t>& table, uint32_t start, uint64_t limit,
               std::vector<uint32_t>& out, OxWorkbookError& error) const;
    bool readChain(uint32_t start, std::string& out, OxWorkbookError& error) const;
    bool readEntry(const Entry& entry, std::string& out, OxWorkbookError& error) const;
    int findRootStream(const std::wstring& name) const;

    const OxWorkbookSource* m_source = nullptr;
    uint32_t m_sectorSize = 512;
    uint32_t m_miniCutoff = 4096;
    uint64_t m_sectorCount = 0;
    std::vector<uint32_t> m_fat;
    std::vector<uint32_t> m_miniFat;
    std::vector<Entry> m_entries;
    std::string m_miniStream;
    std::vector<uint32_t> m_rootStreams;
    std::vector<std::wstring> m_rootStreamNames;
};
