#include <gtest/gtest.h>

#include <algorithm>
#include <cstring>
#include <filesystem>

#include "OxQelLib/transfer/OxQelImportExportTable.h"
#include "TransferTestSupport.h"
#include "platform/core/OxText.h"

using namespace OxTransferTest;

namespace {
// Every row of a table as the engine stores it: each cell's storage class and exact
// content (integers whole, reals by their bits, texts and blobs by their bytes), sorted.
std::vector<std::string> storedRows(sqlite3* db, const std::string& table) {
    std::string quoted = "\"";
    for (char c : table) quoted += c == '"' ? std::string("\"\"") : std::string(1, c);
    quoted += "\"";
    sqlite3_stmt* st = nullptr;
    EXPECT_EQ(sqlite3_prepare_v2(db, ("SELECT * FROM " + quoted).c_str(), -1, &st, nullptr),
              SQLITE_OK)
        << table;
    std::vector<std::string> rows;
    while (st && sqlite3_step(st) == SQLITE_ROW) {
        std::string row;
        for (int i = 0; i < sqlite3_column_count(st); ++i) {
            const int type = sqlite3_column_type(st, i);
            row += std::to_string(type) + ":";
            if (type == SQLITE_INTEGER) {
                row += std::to_string(sqlite3_column_int64(st, i));
            } else if (type == SQLITE_FLOAT) {
                const double d = sqlite3_column_double(st, i);
                uint64_t bits;
                std::memcpy(&bits, &d, sizeof bits);
                row += std::to_string(bits);
            } else if (type == SQLITE_TEXT) {  // in UTF-8, whatever the file's own encoding
                const auto* p = reinterpret_cast<const char*>(sqlite3_column_text(st, i));
                row.append(p ? p : "", static_cast<size_t>(sqlite3_column_bytes(st, i)));
            } else if (type == SQLITE_BLOB) {
                const auto* p = static_cast<const char*>(sqlite3_column_blob(st, i));
                row.append(p ? p : "", static_cast<size_t>(sqlite3_column_bytes(st, i)));
            }
            row += '\x1f';
        }
        rows.push_back(row);
    }
    sqlite3_finalize(st);
    std::sort(rows.begin(), rows.end());
    return rows;
}

class SharedFilesCopyTest : public ::testing::TestWithParam<const char*> {};

// Real files declare types the library knows as no type of its own (VARCHAR(40),
// DATETIME, NVARCHAR(160)); every value must still arrive unchanged, in its storage class.
TEST_P(SharedFilesCopyTest, EveryTableCopiesEveryValueUnchanged) {
    OxTest::TempDir dir;
    const auto sourcePath = dir.file("source.sqlite");
    std::filesystem::copy_file(OxTest::testdata(std::string("sqlite/") + GetParam()), sourcePath);
    OxQelConnectionSQLite from, to;
    ASSERT_TRUE(from.openConnection(sourcePath.wstring(), L"", L"", L""));
    ASSERT_TRUE(to.openConnection(dir.wfile("copy.sqlite"), L"", L"", L""));
    std::vector<OxQelTableDef> tables;
    ASSERT_TRUE(from.getTableDef(tables, OxQelTableDef::Table));
    ASSERT_FALSE(tables.empty());
    OxSQLiteTest::RawDb source(sourcePath), copy(dir.file("copy.sqlite"));
    for (OxQelTableDef& table : tables) {
        const std::string name = OxText::toUtf8(table.getTableName());
        ASSERT_TRUE(from.getFieldDef(table.getTableName(), L"*", table.getFields())) << name;
        EXPECT_EQ(OxQelImportExportTable(from, to, table).run(), OxQel::NoError) << name;
        EXPECT_EQ(storedRows(copy.get(), name), storedRows(source.get(), name)) << name;
    }
}

INSTANTIATE_TEST_SUITE_P(ReadableFiles, SharedFilesCopyTest,
                         ::testing::Values("Chinook_Sqlite.sqlite", "attributes.gpkg",
                                           "dbfuzz2-seed1.db", "plain_1.mbtiles"),
                         [](const auto& info) {
                             std::string n = info.param;
                             for (auto& c : n)
                                 if (!isalnum(static_cast<unsigned char>(c)))
                                     c = '_';
                             return n;
                         });
}  // namespace
