#include <gtest/gtest.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>

#include "OxQelLib/sqlite/OxQelRecordsetSQLite.h"
#include "SQLiteTestSupport.h"
#include "platform/core/OxText.h"

// Every SQLite file of the shared test data, written by other programs: each is opened,
// listed, described and loaded table by table without a crash, and what the library
// reads is what the engine's own command-line tool reads.
namespace {
std::string hex(const uint8_t* data, size_t size) {
    static const char* digits = "0123456789ABCDEF";
    std::string out;
    for (size_t i = 0; i < size; ++i) {
        out.push_back(digits[data[i] >> 4]);
        out.push_back(digits[data[i] & 15]);
    }
    return out;
}

std::string real(double v) {
    char buffer[64];
    std::snprintf(buffer, sizeof buffer, "%.17g", v);
    return buffer;
}

// One value as "type:text", the same from both readers.
std::string canonical(const OxVariant& v) {
    switch (v.vt()) {
        case VT_NULL:
            return "null:";
        case VT_INT:
        case VT_I8:
            return "integer:" + std::to_string(v.vt() == VT_INT ? v.lVal() : v.llVal());
        case VT_R8:
            return "real:" + real(v.dblVal());
        case VT_BSTR: {
            const std::string utf8 = OxText::toUtf8(v.bstr());
            return "text:" + hex(reinterpret_cast<const uint8_t*>(utf8.data()), utf8.size());
        }
        default:
            if (v.isByteArray())
                return "blob:" + hex(v.bytesData(), v.bytesSize());
            return "unexpected:" + std::to_string(v.vt());
    }
}

std::string quoted(const std::wstring& name) {
    std::string out = "\"";
    for (char c : OxText::toUtf8(name)) {
        out.push_back(c);
        if (c == '"')
            out.push_back('"');
    }
    return out + "\"";
}

// The rows of the tool's answer, split at the unit separator 0x1F.
std::vector<std::string> toolRows(const OxTest::TempDir& dir, const std::string& file,
                                  const std::string& sql, bool* ok = nullptr) {
    OxTest::writeFile(dir.file("query.sql"), sql + ";\n");
    const std::string command = "sqlite3 -readonly -batch -bail '" + file + "' < '" +
                                dir.file("query.sql").string() + "' > '" +
                                dir.file("out.txt").string() + "' 2>&1";
    const bool ran = std::system(command.c_str()) == 0;
    if (ok)
        *ok = ran;
    else
        EXPECT_TRUE(ran) << OxTest::readFile(dir.file("out.txt"));
    std::vector<std::string> rows;
    std::string all = OxTest::readFile(dir.file("out.txt"));
    size_t start = 0;
    for (size_t end; (end = all.find('\n', start)) != std::string::npos; start = end + 1)
        rows.push_back(all.substr(start, end - start));
    return rows;
}

std::vector<std::string> toolTable(const OxTest::TempDir& dir, const std::string& file,
                                   const std::wstring& table,
                                   const std::vector<std::wstring>& columns) {
    std::string select;
    for (const auto& c : columns) {
        const std::string q = quoted(c);
        if (!select.empty())
            select += "||char(31)||";
        select += "typeof(" + q + ")||':'||CASE typeof(" + q +
                  ") WHEN 'real' THEN printf('%!.20e'," + q + ") WHEN 'integer' THEN " + q +
                  " WHEN 'null' THEN '' ELSE hex(" + q + ") END";
    }
    if (select.empty())
        return {};
    std::vector<std::string> rows =
        toolRows(dir, file, "SELECT " + select + " FROM " + quoted(table));
    // Reals come back in the tool's own notation; both sides use one.
    for (auto& row : rows) {
        std::string out;
        size_t start = 0;
        while (start <= row.size()) {
            size_t end = row.find('\x1f', start);
            if (end == std::string::npos)
                end = row.size();
            std::string cell = row.substr(start, end - start);
            if (cell.rfind("real:", 0) == 0)
                cell = "real:" + real(std::strtod(cell.c_str() + 5, nullptr));
            out += (start ? "\x1f" : "") + cell;
            start = end + 1;
        }
        row = out;
    }
    return rows;
}
}  // namespace

TEST(SQLiteTestFiles, EveryFileOpensOrFailsCleanlyAndReadsAsTheToolDoes) {
    if (std::system("sqlite3 -version > /dev/null 2>&1") != 0)
        GTEST_SKIP() << "the sqlite3 tool is not installed";
    const std::filesystem::path folder = OxTest::testdata("sqlite");
    OxTest::TempDir dir;
    size_t readable = 0;
    size_t compared = 0;
    for (const auto& entry : std::filesystem::directory_iterator(folder)) {
        const std::string name = entry.path().filename().string();
        SCOPED_TRACE(name);
        const std::filesystem::path copy = dir.file(name);
        std::filesystem::copy_file(entry.path(), copy);
        OxQelConnectionSQLite c;
        bool toolReads = false;
        toolRows(dir, copy.string(), "SELECT count(*) FROM sqlite_master", &toolReads);
        ASSERT_EQ(c.openConnection(copy.wstring(), L"", L"", L""), toolReads);
        if (!toolReads)
            continue;
        ++readable;
        std::vector<OxQelTableDef> objects;
        ASSERT_TRUE(c.getTableDef(objects, OxQelTableDef::AllTypes));
        std::vector<OxQelTableDef> tables;
        ASSERT_TRUE(c.getTableDef(
            tables, OxQelTableDef::Table | OxQelTableDef::View | OxQelTableDef::SystemTable));
        EXPECT_EQ(tables.size(),
                  std::stoul(toolRows(dir, copy.string(),
                                      "SELECT count(*) FROM sqlite_master WHERE type IN "
                                      "('table', 'view')")
                                 .front()));
        for (const auto& table : tables) {
            const std::wstring& t = table.getTableName();
            SCOPED_TRACE(OxText::toUtf8(t));
            OxQelFieldDefArray fields;
            ASSERT_TRUE(c.getFieldDef(t, L"*", fields));
            std::vector<OxQelIndexDef> indexes;
            EXPECT_TRUE(c.getIndexDef(t, indexes));
            OxQelRecordsetSQLite rs;
            ASSERT_TRUE(rs.openSQL(&c, OxText::fromUtf8("SELECT * FROM " + quoted(t))));
            std::vector<std::wstring> columns;
            for (long i = 0; i < rs.getFieldCount(); ++i) columns.push_back(rs.getFieldName(i));
            std::vector<std::string> ours;
            for (; !rs.getEOF(); rs.moveNext()) {
                std::string row;
                for (long i = 0; i < rs.getFieldCount(); ++i)
                    row += (i ? "\x1f" : "") + canonical(rs.getlFieldValue(i));
                ours.push_back(row);
            }
            std::vector<std::string> theirs = toolTable(dir, copy.string(), t, columns);
            std::sort(ours.begin(), ours.end());
            std::sort(theirs.begin(), theirs.end());
            EXPECT_EQ(ours.size(), theirs.size());
            compared += ours.size();
            EXPECT_TRUE(ours == theirs);
        }
    }
    EXPECT_EQ(readable, 4u);
    EXPECT_GT(compared, 10000u);
}
