// "oxqel odbc": the ODBC backend at the terminal: list the data sources, choose one (and
// complete its credentials), list a source's tables, run a query.
#include <cstdio>
#include <memory>

#include "OxClasses/OxConnectionString.h"
#include "OxQelLib/foundation/OxQelLog.h"
#include "OxQelLib/odbc/OxQelConnectionODBC.h"
#include "OxQelLib/odbc/OxQelODBCDataSource.h"
#include "OxQelLib/odbc/OxQelRecordsetODBC.h"
#include "OxqelCommand.h"
#include "platform/core/OxText.h"
#include "platform/odbc/OxDBException.h"
#include "platform/odbc/OxOdbcEnvironment.h"

namespace {
std::string utf8(const std::wstring& text) {
    return OxText::toUtf8(text);
}

int listSources() {
    try {
        OxOdbcEnvironment env;
        for (const auto& s : env.dataSources())
            std::printf("%s\t%s\n", utf8(s.name).c_str(), utf8(s.driver).c_str());
        return 0;
    } catch (const OxDBException& e) {
        return oxqelFail(e.what());
    }
}

int choose(OxqelArgs& args) {
    const bool show = oxqelTakeFlag(args, "--show-password");
    std::wstring connect;
    if (!OxQel::ODBC::selectODBCDataSource(connect))
        return oxqelFail("odbc: no data source chosen");
    std::printf("%s\n", utf8(show ? connect : OxConnectionString::_maskPasswords(connect)).c_str());
    return 0;
}

bool open(OxQelConnectionODBC& c, const std::string& connect) {
    return c.openConnection(L"", OxText::fromUtf8(connect), L"", L"");
}

int tables(const std::string& connect) {
    OxQelConnectionODBC c;
    if (!open(c, connect))
        return oxqelFail("odbc: cannot connect");
    std::vector<OxQelTableDef> defs;
    if (!c.getTableDef(defs, OxQelTableDef::Table | OxQelTableDef::View))
        return oxqelFail("odbc: the data source does not list its tables");
    for (const auto& d : defs)
        std::printf("%s\t%s\n", d.getTableType() == OxQelTableDef::View ? "view" : "table",
                    utf8(d.getTableName()).c_str());
    return 0;
}

int query(const std::string& connect, const std::string& statement) {
    OxQelConnectionODBC c;
    if (!open(c, connect))
        return oxqelFail("odbc: cannot connect");
    std::unique_ptr<OxQelIRecordset> rs(c.createOxQelIRecordset());
    if (!rs->openSQL(&c, OxText::fromUtf8(statement)))
        return oxqelFail("odbc: the statement failed");
    const long columns = rs->getFieldCount();
    for (long i = 0; i < columns; ++i)
        std::printf("%s%s", i ? "\t" : "", utf8(rs->getFieldName(i)).c_str());
    std::printf("\n");
    for (; !rs->getEOF(); rs->moveNext()) {
        for (long i = 0; i < columns; ++i)
            std::printf("%s%s", i ? "\t" : "", utf8(rs->getlFieldString(i)).c_str());
        std::printf("\n");
    }
    return 0;
}

int runOdbc(const OxqelArgs& given) {
    // The library's reports (the driver's own words on a failure) go to standard error.
    OxQel::setDebugInfoType(OxQel::getDebugInfoType() | 4);
    OxqelArgs args = given;
    const std::string what = args.empty() ? "" : args[0];
    if (!args.empty())
        args.erase(args.begin());
    if (what == "sources")
        return listSources();
    if (what == "choose")
        return choose(args);
    if (what == "tables" && args.size() == 1)
        return tables(args[0]);
    if (what == "query" && args.size() == 2)
        return query(args[0], args[1]);
    return oxqelFail(
        "usage: oxqel odbc sources | choose [--show-password] | tables CONNECTION | query "
        "CONNECTION SQL");
}

const OxqelRegisterCommand odbcCommand(
    {"odbc", "sources | choose [--show-password] | tables CONNECTION | query CONNECTION SQL",
     "ODBC data sources: list them, choose one on the terminal, list its tables, run a query",
     runOdbc});
}  // namespace
