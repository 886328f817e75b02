// Reads an Access file image completely: catalog, every definition, every row and value.
// Inputs that start like an Access file are taken whole; any other input becomes the pages
// after a made-up first page, so that small inputs reach the definition and row decoders.
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <vector>

#include "platform/jet/OxJetDatabase.h"

namespace {
constexpr size_t kPage = 4096;

// A Jet 4 first page whose masked settings read back as zeros (no page key, no password).
std::vector<uint8_t> firstPage() {
    std::vector<uint8_t> page(kPage, 0);
    const char magic[] = "\x00\x01\x00\x00Standard Jet DB";
    std::memcpy(page.data(), magic, 19);
    page[0x14] = 1;
    uint8_t s[256];
    const uint8_t key[4] = {0xc7, 0xda, 0x39, 0x6b};
    for (int i = 0; i < 256; ++i) s[i] = static_cast<uint8_t>(i);
    for (int i = 0, j = 0; i < 256; ++i) {
        j = (j + s[i] + key[i % 4]) & 255;
        std::swap(s[i], s[j]);
    }
    for (int n = 0, i = 0, j = 0; n < 128; ++n) {
        i = (i + 1) & 255;
        j = (j + s[i]) & 255;
        std::swap(s[i], s[j]);
        page[0x18 + n] = s[(s[i] + s[j]) & 255];
    }
    return page;
}
}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    std::vector<uint8_t> bytes;
    if (size >= 19 && std::memcmp(data, "\x00\x01\x00\x00Standard", 12) == 0) {
        bytes.assign(data, data + size);
    } else {
        static const std::vector<uint8_t> header = firstPage();
        bytes = header;
        bytes.resize(2 * kPage, 0);  // page 1 unused
        bytes.insert(bytes.end(), data, data + size);
        bytes.resize((bytes.size() + kPage - 1) / kPage * kPage, 0);
    }
    OxJetOpenOptions options;
    options.badRows = size % 2 ? OxJetBadRows::Skip : OxJetBadRows::Fail;
    std::wstring error;
    auto db = OxJetDatabase::openBuffer(std::move(bytes), options, error);
    if (!db)
        return 0;
    size_t work = 0;
    for (const auto& entry : db->catalog()) {
        auto def = db->tableDef(entry, error);
        if (!def)
            continue;
        auto cursor = db->openCursor(def);
        std::wstring text;
        while (cursor->next() && work < 100000)
            for (const auto& v : cursor->values()) {
                text.clear();
                v.appendText(text);
                (void)v.toVariant();
                ++work;
            }
    }
    return 0;
}
