// One open database read by several threads at once, each with its own cursor.
#include <gtest/gtest.h>

#include <thread>

#include "JetTestTools.h"
#include "platform/core/OxText.h"

namespace {
std::wstring render(const OxJetDatabase& db, const std::wstring& table) {
    std::wstring out;
    for (const auto& row : JetTest::readAll(db, table))
        for (const auto& v : row) {
            v.appendText(out);
            out.push_back(L'|');
        }
    return out;
}

TEST(OxJetThreads, CursorsOnSeveralThreadsAgree) {
    auto db = JetTest::open(JetTest::accessFile("ace14_testEmoticonsV2010.accdb"));
    ASSERT_TRUE(db);
    const std::wstring expected = render(*db, L"data");
    ASSERT_FALSE(expected.empty());
    std::vector<std::wstring> results(4);
    std::vector<std::thread> threads;
    for (size_t t = 0; t < results.size(); ++t)
        threads.emplace_back([&, t] {
            for (int round = 0; round < 5; ++round) results[t] = render(*db, L"data");
        });
    for (auto& th : threads) th.join();
    for (const auto& r : results) EXPECT_EQ(r, expected);
}
}  // namespace
