// "oxqel demo": the library's main job shown end to end on the engines it has.
#include <cstdio>

#include "OxClasses/OxConnectionString.h"
#include "OxQelLib/foundation/OxQelQueryText.h"
#include "OxQelLib/interfaces/OxQelConnectionDefault.h"
#include "OxqelCommand.h"
#include "platform/core/OxText.h"

namespace {
void say(const std::wstring& text) {
    std::printf("%s\n", OxText::toUtf8(text).c_str());
}

int runDemo(const OxqelArgs&) {
    const std::wstring statement = L"SELECT [Name] FROM [Artist] WHERE [Name] = ]]AC/DC[[";
    say(L"neutral statement:  " + statement);
    say(L"for PostgreSQL:     " + OxQel::formatExprForPostGre(statement));
    say(L"for MySQL:          " + OxQel::formatExprForMySQL(statement));
    say(L"reported as:        " +
        OxConnectionString::_maskPasswords(L"Driver={PostgreSQL};Server=db;UID=me;PWD=secret"));
    OxQelConnectionDefault none;
    say(std::wstring(L"null backend open:  ") +
        (none.openConnection(L"x", L"", L"", L"") ? L"yes" : L"no (as it should)"));
    return 0;
}

const OxqelRegisterCommand demo({"demo", "", "shows the library at work (the default command)",
                                 runDemo});
}  // namespace
