#include <gtest/gtest.h>

#include "platform/ado/OxAdoConnectionString.h"
#include "platform/ado/OxAdoProviderRegistry.h"

TEST(AdoConnectionStringTest, QuotesAndBracesHoldSeparators) {
    const OxAdoConnectionString cs(
        L"Provider=MSDASQL.1; Extended Properties=\"DSN=x;UID=u\";Password='it''s;';"
        L"Driver={SQL Server}}; x};x;;Server=s1;SERVER=s2");
    EXPECT_EQ(cs.get(L"provider"), L"MSDASQL.1");
    EXPECT_EQ(cs.get(L"Extended Properties"), L"DSN=x;UID=u");
    EXPECT_EQ(cs.get(L"PASSWORD"), L"it's;");
    // Braces are kept for ODBC, "}}" standing for one brace inside.
    EXPECT_EQ(cs.get(L"Driver"), L"{SQL Server}}; x}");
    // The last of repeated keys wins; a segment without "=" carries nothing.
    EXPECT_EQ(cs.get(L"Server"), L"s2");
    EXPECT_EQ(cs.pairs().size(), 5u);
    // Written back, the values that need them get their quotes again.
    const OxAdoConnectionString again(cs.text());
    EXPECT_EQ(again.pairs(), cs.pairs());
}

TEST(AdoConnectionStringTest, ProviderChoice) {
    EXPECT_EQ(OxAdoConnectionString::baseProviderName(L" MSDASQL.1 "), L"MSDASQL");
    EXPECT_EQ(OxAdoConnectionString::baseProviderName(L"SQLOLEDB"), L"SQLOLEDB");
    // Without a Provider key, Driver= and DSN= strings go to the ODBC provider.
    EXPECT_EQ(OxAdoProviderRegistry::providerOf(L"DSN=x;UID=u"), L"MSDASQL");
    EXPECT_EQ(OxAdoProviderRegistry::providerOf(L"Provider=Other;DSN=x"), L"Other");
    try {
        OxAdoProviderRegistry::createSession(L"Provider=Nobody.Here;");
        FAIL() << "no such provider";
    } catch (const OxAdoProviderError& e) {
        EXPECT_EQ(e.hresult(), OxAdo::hresultOf(OxAdo::adErrProviderNotFound));
    }
}
