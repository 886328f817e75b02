// A host program built against the installed library only.
#include <cstdio>
#include <fstream>
#include <iterator>
#include <memory>
#include <string>

#include "OxQelLib/foundation/OxQelLog.h"
#include "OxQelLib/foundation/OxQelQueryText.h"
#include "OxQelLib/interfaces/OxQelConnectionDefault.h"
#include "OxQelLib/interfaces/OxQelIRecordset.h"
#include "platform/core/OxText.h"

int main(int argc, char** argv) {
    if (argc < 2)
        return 2;
    const OxQel::FieldType type = OxQel::WString;
    if (OxQel::getQueryCharacterBegin(type) != L"]]]")
        return 3;

    OxQel::setDebugInfoType(8);
    OxQel::setDebugLogFilePath(OxText::fromUtf8(argv[1]));
    OxQel::showDebugErrorMsg(L"host message", OxQel::LogLevelError, L"Host::main", L"host", 1, L"");
    std::ifstream log(argv[1]);
    const std::string text((std::istreambuf_iterator<char>(log)), {});
    if (text.find("MESSAGE: host message") == std::string::npos)
        return 4;

    OxQelConnectionDefault connection;
    if (connection.openConnection(L"db", L"", L"", L""))
        return 5;
    std::unique_ptr<OxQelIRecordset> rs(connection.createOxQelIRecordset());
    if (!rs || !rs->getEOF())
        return 6;
    std::puts("host: ok");
    return 0;
}
