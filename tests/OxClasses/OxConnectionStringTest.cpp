#include <gtest/gtest.h>

#include "OxClasses/OxConnectionParameter.h"
#include "OxClasses/OxConnectionString.h"

namespace {
OxConnectionString exploded(const std::wstring& text) {
    OxConnectionString cs(text);
    cs.explode();
    return cs;
}

TEST(ConnectionStringTest, ExplodeKeepsTheTextsRules) {
    auto cs = exploded(L"Driver={X};Server=s1;server=s2");
    EXPECT_EQ(cs.map().size(), 2u);
    EXPECT_EQ(cs.getAt(L"DRIVER"), L"{X}");
    EXPECT_EQ(cs.getAt(L"server"), L"s2");  // a later pair replaces an earlier one

    cs = exploded(L"A=1; B=2");  // blanks stay part of keys and values
    EXPECT_EQ(cs.getAt(L"A"), L"1");
    EXPECT_EQ(cs.getAt(L" B"), L"2");
    EXPECT_EQ(cs.getAt(L"B"), L"");

    cs = exploded(L"A=1;B");
    EXPECT_EQ(cs.map().size(), 1u);

    cs = exploded(L"FLAG;A=1");
    EXPECT_EQ(cs.getAt(L"FLAG;A"), L"1");

    cs = exploded(L"=x;K=;L=v;");  // no key, and an empty value, give no pair
    EXPECT_EQ(cs.map().size(), 1u);
    EXPECT_EQ(cs.getAt(L"L"), L"v");

    cs = exploded(L"DSN={a;b}");  // braces are not recognised
    EXPECT_EQ(cs.getAt(L"DSN"), L"{a");
    EXPECT_TRUE(exploded(L"").map().empty());
}

TEST(ConnectionStringTest, AssignmentDoesNotSplit) {
    OxConnectionString cs(L"A=1");
    cs.explode();
    cs = std::wstring(L"B=2");
    EXPECT_EQ(cs.getAt(L"A"), L"1");
    EXPECT_EQ(static_cast<const std::wstring&>(cs), L"B=2");
    cs.reset();
    EXPECT_TRUE(cs.empty());
    EXPECT_TRUE(cs.map().empty());
}

TEST(ConnectionStringTest, ComposeSetAndRemove) {
    OxConnectionString cs;
    cs.setAt(L"uid", L"u");
    cs.compose();
    EXPECT_EQ(static_cast<const std::wstring&>(cs), L"UID=u");
    cs.setAt(L"Pwd", L"p");
    cs.compose();
    EXPECT_TRUE(cs == L"UID=u; PWD=p" || cs == L"PWD=p; UID=u")
        << static_cast<const std::wstring&>(cs);
    cs.removeAt(L"pwd");
    cs.removeAt(L"missing");
    cs.compose();
    EXPECT_EQ(static_cast<const std::wstring&>(cs), L"UID=u");
}

TEST(ConnectionStringTest, MaskHidesEveryCredential) {
    EXPECT_EQ(OxConnectionString::_maskPasswords(L"DSN=x;UID=me;PWD=secret"),
              L"DSN=x;UID=me;PWD=***");
    EXPECT_EQ(OxConnectionString::_maskPasswords(L"UID=me; Password=a;b"),
              L"UID=me; Password=***;b");
    EXPECT_EQ(OxConnectionString::_maskPasswords(L"pwd={se;cr}}et};Server=s"), L"pwd=***;Server=s");
    EXPECT_EQ(OxConnectionString::_maskPasswords(L"Jet OLEDB:Database Password='x;y'"),
              L"Jet OLEDB:Database Password=***");
    EXPECT_EQ(OxConnectionString::_maskPasswords(L"Server=s;PWD="), L"Server=s;PWD=");
    EXPECT_EQ(OxConnectionString::_maskPasswords(L"plain text"), L"plain text");
    EXPECT_EQ(OxConnectionString::_maskPasswords(L"a;;PWD=x;"), L"a;;PWD=***;");
}

TEST(ConnectionParameterTest, DriverNameComesFromTheHost) {
    OxConnectionParameter p;
    p.setHost(L"DRIVER={Firebird};DBNAME=x");
    EXPECT_EQ(p.getDriverName(), L"{Firebird}");
    p.setHost(L"DBNAME=x;DRIVER={Firebird}");
    EXPECT_EQ(p.getDriverName(), L"{Firebird}");
    p.setHost(L"SERVER=s");
    EXPECT_EQ(p.getDriverName(), L"{Firebird}");
    p.setHost(L"driver=lower");  // searched with case
    EXPECT_EQ(p.getDriverName(), L"{Firebird}");
    p.setDatabase(L"db");
    p.setUserId(L"u");
    p.setPassword(L"p");
    p.clear();
    EXPECT_TRUE(p.getDatabase().empty() && p.getHost().empty() && p.getUserId().empty() &&
                p.getPassword().empty());
    EXPECT_EQ(p.getDriverName(), L"{Firebird}");
}
}  // namespace
