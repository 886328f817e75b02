// Every shared Access file against the independent command-line reader: the same tables,
// row counts and values. Where that reader is known to be wrong, the cell is mapped to what
// it prints (and the right value is checked in OxJetDatabaseTest).
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <map>

#include "JetTestTools.h"
#include "platform/core/OxFormat.h"
#include "platform/core/OxText.h"

namespace {
const char* const kNull = "<NULL>";
// Separators no test value contains (one holds every control character).
const char* const kField = "<#F#>";
const char* const kRecord = "<#R#>";
// Values the other reader cannot print: its date conversion covers only these years, and
// its bound buffers cut text at this many bytes.
constexpr double kFirstGoodDate = 1.0;      // 1899-12-31
constexpr double kLastGoodDate = 292518.0;  // 2700-11-30
constexpr size_t kBoundText = 16383;

std::vector<std::string> split(const std::string& s, const std::string& sep) {
    std::vector<std::string> parts;
    size_t start = 0;
    for (;;) {
        const size_t at = s.find(sep, start);
        if (at == std::string::npos) {
            parts.push_back(s.substr(start));
            return parts;
        }
        parts.push_back(s.substr(start, at - start));
        start = at + sep.size();
    }
}

// Our row (where an empty cell matches anything) against theirs.
bool matches(const std::vector<std::string>& ours, const std::vector<std::string>& theirs) {
    if (ours.size() != theirs.size())
        return false;
    for (size_t i = 0; i < ours.size(); ++i)
        if (!ours[i].empty() && ours[i] != theirs[i])
            return false;
    return true;
}

std::string hexOf(const std::string& bytes) {
    std::wstring hex;
    OxJetValue::appendHex(hex, reinterpret_cast<const uint8_t*>(bytes.data()), bytes.size());
    return OxText::toUtf8(hex);
}

// The value as the other reader prints it with the options used below; "" to skip the cell.
std::string theirForm(const OxJetValue& v) {
    char buffer[64];
    switch (v.kind) {
        case OxJetValue::Unsupported:
            return "";
        case OxJetValue::Null:
            return kNull;
        case OxJetValue::Text: {
            if (v.text.empty())
                return kNull;  // it cannot tell an empty text from NULL
            std::wstring bmp;  // it reads UCS-2: each half of a surrogate pair becomes '?'
            for (wchar_t c : v.text) bmp += c > 0xFFFF ? L"??" : std::wstring(1, c);
            std::string utf8 = OxText::toUtf8(bmp);
            if (utf8.size() > kBoundText)
                utf8.resize(kBoundText);
            return utf8;
        }
        case OxJetValue::Single:
            std::snprintf(buffer, sizeof buffer, "%.8g", static_cast<double>(v.single));
            return buffer;
        case OxJetValue::Double:
            std::snprintf(buffer, sizeof buffer, "%.16g", v.real);  // not round-trip safe
            return buffer;
        case OxJetValue::DateTime:
            if (v.real < kFirstGoodDate || v.real > kLastGoodDate)
                return "";
            return OxText::toUtf8(v.toText());
        case OxJetValue::Guid: {
            // It leaves out the hyphen before the last group.
            std::string text = OxText::toUtf8(v.toText());
            text.erase(text.rfind('-'), 1);
            return hexOf(text);
        }
        default:
            return OxText::toUtf8(v.toText());
    }
}

std::vector<std::string> userTables(const OxJetDatabase& db) {
    std::vector<std::string> names;
    for (const auto& e : db.catalog())
        if (e.kind == OxJetObjectKind::Table)
            names.push_back(OxText::toUtf8(e.name));
    return names;
}

struct Case {
    std::string file;
    uint16_t codePage = 0;
    std::vector<std::string> env;
};

class CompareWithMdbTools : public testing::TestWithParam<Case> {};

TEST_P(CompareWithMdbTools, SameTablesCountsAndValues) {
    if (!JetTest::haveMdbTools()) {
        // CI installs it (scripts/packages/jet.txt): there a missing reader is a failure.
        if (std::getenv("CI"))
            FAIL() << "mdbtools is not installed (scripts/packages/jet.txt)";
        GTEST_SKIP() << "mdbtools is not installed (scripts/packages/jet.txt)";
    }
    const Case& c = GetParam();
    const std::string path = JetTest::accessFile(c.file).string();
    OxJetOpenOptions options;
    options.codePage = c.codePage;
    auto db = JetTest::open(path, options);
    ASSERT_TRUE(db);

    const auto tables = JetTest::run({"mdb-tables", "-1", path}, c.env);
    ASSERT_EQ(tables.exitCode, 0) << tables.err;
    std::vector<std::string> theirs = split(tables.out, "\n");
    theirs.erase(std::remove(theirs.begin(), theirs.end(), ""), theirs.end());
    auto ours = userTables(*db);
    EXPECT_EQ(ours, theirs);

    for (const std::string& table : ours) {
        SCOPED_TRACE(table);
        std::wstring error;
        auto def = db->tableDef(OxText::fromUtf8(table), error);
        ASSERT_TRUE(def) << OxText::toUtf8(error);
        const auto count = JetTest::run({"mdb-count", path, table}, c.env);
        EXPECT_EQ(std::to_string(def->rowCount) + "\n", count.out);

        const auto exported =
            JetTest::run({"mdb-export", "-0", kNull, "-Q", "-d", kField, "-R", kRecord, "-T",
                          "%Y-%m-%dT%H:%M:%S", "-b", "hex", "-B", path, table},
                         c.env);
        ASSERT_EQ(exported.exitCode, 0) << exported.err;
        std::vector<std::string> records = split(exported.out, kRecord);
        ASSERT_FALSE(records.empty());
        if (records.back().empty())
            records.pop_back();
        std::vector<std::string> header = split(records[0], kField);
        std::vector<std::string> names;
        for (const auto& col : def->columns) names.push_back(OxText::toUtf8(col.name));
        EXPECT_EQ(names, header);

        std::vector<std::vector<std::string>> theirRows;
        for (size_t r = 1; r < records.size(); ++r) theirRows.push_back(split(records[r], kField));
        const auto rows = JetTest::readAll(*db, OxText::fromUtf8(table));
        ASSERT_EQ(rows.size(), theirRows.size());
        // Each of our rows matches one of theirs: the other reader lists moved rows where
        // their data landed, so the orders differ.
        std::vector<bool> used(theirRows.size(), false);
        for (const auto& row : rows) {
            std::vector<std::string> cells;
            for (const auto& v : row) cells.push_back(theirForm(v));
            bool found = false;
            for (size_t r = 0; r < theirRows.size() && !found; ++r)
                if (!used[r] && matches(cells, theirRows[r]))
                    used[r] = found = true;
            EXPECT_TRUE(found) << "no row like " << testing::PrintToString(cells);
        }
    }
}

std::vector<Case> cases() {
    std::vector<Case> list;
    for (const auto& f : JetTest::accessFiles()) {
        const std::string name = f.filename().string();
        if (name == "ace14_db2007-enc.accdb")
            continue;  // encrypted: OxJetDatabaseTest checks the refusal
        list.push_back({name, 0, {}});
    }
    // Text written in another code page than the file names: both readers told so.
    list.push_back({"jet3_charsetGBK.mdb", 936, {"MDB_JET3_CHARSET=GBK"}});
    return list;
}

std::string caseName(const testing::TestParamInfo<Case>& info) {
    std::string name = info.param.file.substr(0, info.param.file.find('.'));
    for (char& ch : name)
        if (!isalnum(static_cast<unsigned char>(ch)))
            ch = '_';
    return info.param.codePage ? name + "_cp" + std::to_string(info.param.codePage) : name;
}

INSTANTIATE_TEST_SUITE_P(AccessFiles, CompareWithMdbTools, testing::ValuesIn(cases()), caseName);
}  // namespace

namespace {
std::string lower(const std::wstring& s) {
    return OxText::toUtf8(OxText::toLower(s));
}

// The indexes as the other reader's schema dump writes them (it leaves out the engine's
// relationship indexes).
std::vector<std::string> theirIndexes(const std::string& path) {
    const auto schema =
        JetTest::run({"mdb-schema", "--indexes", "--no-not-null", path, "postgres"});
    std::vector<std::string> lines;
    for (const std::string& line : split(schema.out, "\n"))
        if (line.rfind("CREATE ", 0) == 0 && line.find(" INDEX ") != std::string::npos)
            lines.push_back(line);
        else if (line.find(" PRIMARY KEY ") != std::string::npos)
            lines.push_back(line);
    std::sort(lines.begin(), lines.end());
    return lines;
}

std::vector<std::string> ourIndexes(const OxJetDatabase& db) {
    std::vector<std::string> lines;
    for (const auto& e : db.catalog()) {
        if (e.kind != OxJetObjectKind::Table)
            continue;
        std::wstring error;
        auto def = db.tableDef(e, error);
        EXPECT_TRUE(def) << OxText::toUtf8(error);
        if (!def)
            continue;
        const std::string table = lower(def->name);
        for (const auto& ix : def->indexes) {
            if (ix.foreignKey)
                continue;
            std::string cols;
            for (const auto& k : ix.columns) {
                if (!cols.empty())
                    cols += ", ";
                cols += "\"" + lower(def->columns[k.column].name) + "\"" +
                        (k.descending ? " DESC" : "");
            }
            if (ix.primary)
                lines.push_back("ALTER TABLE \"" + table + "\" ADD CONSTRAINT \"" + table +
                                "_pkey\" PRIMARY KEY (" + cols + ");");
            else
                lines.push_back(std::string("CREATE ") + (ix.unique ? "UNIQUE " : "") + "INDEX \"" +
                                table + "_" + lower(ix.name) + "_idx\" ON \"" + table + "\" (" +
                                cols + ");");
        }
    }
    std::sort(lines.begin(), lines.end());
    return lines;
}

class IndexesLikeMdbTools : public testing::TestWithParam<std::string> {};

TEST_P(IndexesLikeMdbTools, SameKeysInOrder) {
    if (!JetTest::haveMdbTools()) {
        // CI installs it (scripts/packages/jet.txt): there a missing reader is a failure.
        if (std::getenv("CI"))
            FAIL() << "mdbtools is not installed (scripts/packages/jet.txt)";
        GTEST_SKIP() << "mdbtools is not installed (scripts/packages/jet.txt)";
    }
    const std::string path = JetTest::accessFile(GetParam()).string();
    auto db = JetTest::open(path);
    ASSERT_TRUE(db);
    EXPECT_EQ(ourIndexes(*db), theirIndexes(path));
}

INSTANTIATE_TEST_SUITE_P(AccessFiles, IndexesLikeMdbTools,
                         testing::Values("jet3_indexTestV1997.mdb", "jet4_testUnicodeCompV2003.mdb",
                                         "ace12_complexDataTestV2007.accdb",
                                         "ace14_indexTestV2010.accdb", "ace14_testV2010.accdb",
                                         "ace17_extDateTestV2019.accdb"),
                         [](const testing::TestParamInfo<std::string>& info) {
                             std::string n = info.param.substr(0, info.param.find('.'));
                             return n;
                         });
}  // namespace

namespace {
// Relationships against the rows of MSysRelationships as the other reader exports them
// (its own schema dump leaves one relationship out in both index test files).
class RelationshipsLikeMdbTools : public testing::TestWithParam<std::string> {};

TEST_P(RelationshipsLikeMdbTools, SameRelationships) {
    if (!JetTest::haveMdbTools())
        GTEST_SKIP() << "mdbtools is not installed (scripts/packages/jet.txt)";
    const std::string path = JetTest::accessFile(GetParam()).string();
    auto db = JetTest::open(path);
    ASSERT_TRUE(db);
    std::vector<OxJetRelationship> relationships;
    std::wstring error;
    ASSERT_TRUE(db->relationships(relationships, error)) << OxText::toUtf8(error);
    std::vector<std::string> ours;
    for (const auto& r : relationships)
        for (size_t i = 0; i < r.columns.size(); ++i)
            ours.push_back(OxText::toUtf8(oxFormat(L"%s|%u|%u|%u|%s|%s|%s|%s", r.name, r.flags,
                                                   r.columns.size(), i, r.table, r.columns[i].first,
                                                   r.referencedTable, r.columns[i].second)));
    const auto exported =
        JetTest::run({"mdb-export", "-H", "-Q", "-d", "|", path, "MSysRelationships"});
    ASSERT_EQ(exported.exitCode, 0) << exported.err;
    std::vector<std::string> theirs = split(exported.out, "\n");
    theirs.erase(std::remove(theirs.begin(), theirs.end(), ""), theirs.end());
    std::sort(ours.begin(), ours.end());
    std::sort(theirs.begin(), theirs.end());
    EXPECT_EQ(ours, theirs);
}

INSTANTIATE_TEST_SUITE_P(AccessFiles, RelationshipsLikeMdbTools,
                         testing::Values("jet3_indexTestV1997.mdb", "ace14_indexTestV2010.accdb",
                                         "jet4_testUnicodeCompV2003.mdb",
                                         "ace17_extDateTestV2019.accdb"),
                         [](const testing::TestParamInfo<std::string>& info) {
                             return info.param.substr(0, info.param.find('.'));
                         });
}  // namespace
