#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "platform/jet/OxJetSchema.h"

// What the first page says about the file.
struct OxJetHeader {
    OxJetFormat format = OxJetFormat::Jet4;
    uint32_t pageSize = 4096;
    uint16_t codePage = 0;
    uint32_t sortOrder = 0;
    uint32_t pageKey = 0;  // non-zero: pages are scrambled with this key
    std::wstring password;
    double created = 0;

    bool isJet3() const { return format == OxJetFormat::Jet3; }
};

// The pages of an Access file, read on demand with pread (or from memory), descrambled when
// the file is encoded. read() is const and safe to call from several threads.
class OxJetPageFile {
public:
    // Throws OxJetError when the file cannot be read, is no Access file, or is encrypted.
    static std::shared_ptr<OxJetPageFile> openFile(const std::string& path);
    static std::shared_ptr<OxJetPageFile> openBuffer(std::vector<uint8_t> bytes);
    ~OxJetPageFile();
    OxJetPageFile(const OxJetPageFile&) = delete;
    OxJetPageFile& operator=(const OxJetPageFile&) = delete;

    const OxJetHeader& header() const { return m_header; }
    uint32_t pageSize() const { return m_header.pageSize; }
    uint32_t pageCount() const { return m_pageCount; }
    uint64_t fileSize() const { return m_fileSize; }
    bool truncated() const { return m_fileSize % m_header.pageSize != 0; }

    // Copies page number `page` into out (pageSize bytes); throws OxJetError when the page
    // lies past the end of the file or cannot be read.
    void read(uint32_t page, uint8_t* out) const;

    // The bounds of row `row` on a data page: throws when the page holds no such row or
    // its offsets are out of order. flags keeps the two high bits of the row's offset.
    struct Row {
        uint32_t start = 0;
        uint32_t size = 0;
        uint16_t flags = 0;
    };
    uint32_t rowCount(const uint8_t* page) const;
    Row row(const uint8_t* page, uint32_t row) const;

    // Rows a scan passes over: deleted, or only reached through a moved row's pointer.
    static constexpr uint16_t kRowDeleted = 0x8000;
    // A row that holds only the pointer to where its data moved.
    static constexpr uint16_t kRowMoved = 0x4000;

private:
    OxJetPageFile() = default;
    void readHeader();
    void readRaw(uint32_t page, uint8_t* out) const;

    int m_fd = -1;
    std::vector<uint8_t> m_memory;  // buffer-backed files
    uint64_t m_fileSize = 0;
    uint32_t m_pageCount = 0;
    OxJetHeader m_header;
};
