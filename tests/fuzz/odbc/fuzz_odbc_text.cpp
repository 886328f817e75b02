// The ODBC backend's text handling on arbitrary input: the literal-marker rewriting (which
// overwrites the statement in place and must keep its length) for Firebird and other
// drivers, and the composition of the connection string from host and arguments with its
// masked form for reports.
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>

#include "OxQelLib/odbc/OxQelConnectionODBC.h"
#include "platform/core/OxText.h"

namespace {
OxQelConnectionODBC& connection(bool firebird) {
    static OxQelConnectionODBC other;
    static OxQelConnectionODBC fb;
    static const bool opened = [] {
        // The open fails (no such driver); the driver's name is kept all the same.
        fb.openConnection(L"", L"DRIVER={Firebird Fuzz}", L"", L"");
        return true;
    }();
    (void)opened;
    return firebird ? fb : other;
}
}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    if (size == 0)
        return 0;
    const std::wstring text =
        OxText::fromUtf8(std::string_view(reinterpret_cast<const char*>(data) + 1, size - 1));
    const bool firebird = data[0] & 1;
    if (firebird && !connection(true).IsFireBirdDriver())
        std::abort();
    const std::wstring rewritten = connection(firebird).formatBeforeExecute(text);
    if (rewritten.size() != text.size())
        std::abort();

    // Host, database, user id and password: the text cut at its first three '|'.
    std::wstring parts[4];
    size_t p = 0;
    for (int i = 0; i < 4; ++i) {
        const size_t bar = i < 3 ? text.find(L'|', p) : std::wstring::npos;
        parts[i] = text.substr(p, bar == std::wstring::npos ? std::wstring::npos : bar - p);
        p = bar == std::wstring::npos ? text.size() : bar + 1;
    }
    const std::wstring composed =
        OxQelConnectionODBC::_composeConnectString(parts[1], parts[0], parts[2], parts[3]);
    // Every pair stands on its own: a braced value never runs on into the next pair, so the
    // password the arguments gave is a pair of its own.
    if (!parts[3].empty() && parts[3].find_first_of(L";{}") == std::wstring::npos) {
        const std::wstring pair = L"PWD=" + parts[3];
        bool standsAlone = false;
        for (size_t at = composed.find(pair); at != std::wstring::npos && !standsAlone;
             at = composed.find(pair, at + 1))
            standsAlone =
                (at == 0 || composed[at - 1] == L';') &&
                (at + pair.size() == composed.size() || composed[at + pair.size()] == L';');
        if (!standsAlone)
            std::abort();
    }
    return 0;
}
