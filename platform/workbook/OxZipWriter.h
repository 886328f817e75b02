#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "platform/workbook/OxWorkbookOutputFile.h"

struct z_stream_s;

// Writes a zip package entry by entry, deflating as the data arrives. Sizes and CRCs are
// patched into each local header afterwards, so no data descriptors are needed.
class OxZipWriter {
public:
    explicit OxZipWriter(OxWorkbookOutputFile& out, int level = 6);
    ~OxZipWriter();
    OxZipWriter(const OxZipWriter&) = delete;
    OxZipWriter& operator=(const OxZipWriter&) = delete;

    void beginEntry(const std::string& name);
    void write(const char* data, size_t len);
    void write(const std::string& data) { write(data.data(), data.size()); }
    void endEntry();
    void addEntry(const std::string& name, const std::string& data);
    void finish();  // the central directory

private:
    struct Entry {
        std::string name;
        uint64_t offset;
        uint32_t crc;
        uint64_t compressed;
        uint64_t size;
    };
    void deflateSome(int flush);

    OxWorkbookOutputFile& m_out;
    int m_level;
    z_stream_s* m_z = nullptr;
    std::vector<Entry> m_entries;
    bool m_open = false;
    std::string m_buffer;
};
