#include <gtest/gtest.h>

#include <algorithm>

#include "platform/odbc/OdbcTestEnv.h"
#include "platform/odbc/OxOdbcEnvironment.h"

namespace {
TEST(OdbcEnvironment, ListsThePrivateDataSourcesAndTheirKeys) {
    OdbcTest::Env::get();
    OxOdbcEnvironment env;
    const auto sources = env.dataSources();
    const auto named = [&](const std::wstring& name) {
        return std::find_if(sources.begin(), sources.end(),
                            [&](const auto& s) { return s.name == name; });
    };
    ASSERT_NE(named(L"sqlite_test"), sources.end());
    EXPECT_EQ(named(L"sqlite_test")->driver, L"SQLite3");
    EXPECT_NE(named(L"firebird_test"), sources.end());
    EXPECT_TRUE(env.dataSources(OxOdbcEnvironment::Scope::user).empty());
    EXPECT_EQ(env.dataSources(OxOdbcEnvironment::Scope::system).size(), sources.size());

    const auto drivers = env.drivers();
    EXPECT_NE(std::find(drivers.begin(), drivers.end(), L"SQLite3"), drivers.end());

    const auto keys = OxOdbcEnvironment::dataSourceAttributes(L"sqlite_test");
    const auto database = std::find_if(keys.begin(), keys.end(),
                                       [](const auto& k) { return k.first == L"Database"; });
    ASSERT_NE(database, keys.end());
    EXPECT_NE(database->second.find(L"sqlite_test.db"), std::wstring::npos);
    EXPECT_TRUE(OxOdbcEnvironment::dataSourceAttributes(L"no_such_source").empty());
}
}  // namespace
