#include <gtest/gtest.h>
#include <sys/stat.h>

#include "OxQelLib/interfaces/OxQelIPreparedQuery.h"
#include "OxQelLib/interfaces/OxQelIRecordset.h"
#include "SQLiteTestSupport.h"

using OxSQLiteTest::Database;
using OxSQLiteTest::LogCapture;
using OxSQLiteTest::RawDb;

namespace {
// A private copy of a shared test file: the originals are never opened for writing.
std::wstring copyOfTestFile(const OxTest::TempDir& dir, const std::string& name) {
    std::filesystem::copy_file(OxTest::testdata("sqlite/" + name), dir.file(name));
    return dir.wfile(name);
}
}  // namespace

TEST(SQLiteConnectionOpen, RefusesWhatIsNoUsableDatabase) {
    LogCapture log;
    OxTest::TempDir dir;
    OxQelConnectionSQLite c;

    EXPECT_FALSE(c.openConnection(L"", L"", L"", L""));
    EXPECT_EQ(log.text(), "") << "an empty path is refused without a report";

    EXPECT_FALSE(c.openConnection(L"/nonexistent-folder/x.db", L"", L"", L""));
    EXPECT_TRUE(log.contains("Unable to open the database file "));
    EXPECT_TRUE(log.contains("FUNCTION: OxQelConnectionSQLite::openConnection"));
    EXPECT_FALSE(c.isOpen());
    EXPECT_EQ(c.getHandle(), nullptr);
    EXPECT_EQ(c.getLastError(), OxQel::ErrorUnknown);

    // The engine opens files lazily; the connection must not report success for a file
    // that no statement could ever read.
    OxTest::writeFile(dir.file("text.db"), std::string(5000, 'x'));
    log.clear();
    EXPECT_FALSE(c.openConnection(dir.wfile("text.db"), L"", L"", L""));
    EXPECT_TRUE(log.contains("File opened that is not a database file "));
    EXPECT_FALSE(c.isOpen());

    log.clear();
    EXPECT_FALSE(c.openConnection(copyOfTestFile(dir, "sqlcipher-4.0-testkey.db"), L"", L"", L""));
    EXPECT_TRUE(log.contains("File opened that is not a database file "));

    log.clear();
    EXPECT_FALSE(c.openConnection(copyOfTestFile(dir, "corrupt.mbtiles"), L"", L"", L""));
    EXPECT_TRUE(log.contains("The database disk image is malformed "));
    EXPECT_FALSE(c.isOpen());
    EXPECT_EQ(c.getHandle(), nullptr);
}

TEST(SQLiteConnectionOpen, OpeningAgainClosesTheFirstFileAndStoresTheStrings) {
    Database a("CREATE TABLE only_in_a(x);");
    Database b("CREATE TABLE only_in_b(x);");
    OxQelConnectionSQLite& c = a.connection();
    EXPECT_TRUE(c.findTable(L"only_in_a"));
    EXPECT_TRUE(c.openConnection(b.wpath(), L"DRIVER=Some Driver;X=1", L"user", L"secret"));
    EXPECT_TRUE(c.findTable(L"only_in_b"));
    EXPECT_FALSE(c.findTable(L"only_in_a"));
    const OxConnectionParameter p = c.getConnectionParameter();
    EXPECT_EQ(p.getDatabase(), b.wpath());
    EXPECT_EQ(p.getHost(), L"DRIVER=Some Driver;X=1");
    EXPECT_EQ(p.getDriverName(), L"Some Driver");
    EXPECT_EQ(p.getUserId(), L"user");
    EXPECT_EQ(p.getPassword(), L"secret");
}

TEST(SQLiteConnectionOpen, ReadOnlyFileReadsButRefusesWrites) {
    OxTest::TempDir dir;
    const std::wstring path = copyOfTestFile(dir, "Chinook_Sqlite.sqlite");
    ::chmod(dir.file("Chinook_Sqlite.sqlite").c_str(), 0444);
    LogCapture log;
    OxQelConnectionSQLite c;
    ASSERT_TRUE(c.openConnection(path, L"", L"", L""));
    EXPECT_TRUE(c.findTable(L"Album"));
    if (::geteuid() != 0) {  // root writes whatever the mode says
        EXPECT_FALSE(c.execute(L"DELETE FROM Album"));
        EXPECT_TRUE(log.contains("Attempt to write a readonly database "));
    }
}

TEST(SQLiteConnectionExecute, RunsEveryStatementOfATextInTurn) {
    Database db;
    OxQelConnectionSQLite& c = db.connection();
    EXPECT_TRUE(c.execute(L""));
    EXPECT_TRUE(c.execute(L"CREATE TABLE t(a INTEGER UNIQUE); INSERT INTO t VALUES (1);"));
    EXPECT_EQ(db.raw().scalar("SELECT count(*) FROM t"), "1");

    // The first statement stays done when a later one fails; nothing is rolled back.
    LogCapture log;
    EXPECT_FALSE(
        c.execute(L"INSERT INTO t VALUES (2); INSERT INTO t VALUES (1); "
                  L"INSERT INTO t VALUES (3)"));
    EXPECT_EQ(db.raw().rows("SELECT a FROM t ORDER BY a"), (std::vector<std::string>{"1", "2"}));
    EXPECT_TRUE(log.contains("Abort due to constraint violation "));
    EXPECT_TRUE(log.contains("Expression : INSERT INTO t VALUES (2);"));
    EXPECT_TRUE(log.contains("UNIQUE constraint failed: t.a"));

    log.clear();
    EXPECT_FALSE(c.execute(L"SELCT nonsense"));
    EXPECT_TRUE(log.contains("Compiled expression : Empty expression"));

    // A statement that yields rows is a failure of execute.
    log.clear();
    EXPECT_FALSE(c.execute(L"SELECT a FROM t"));
    EXPECT_TRUE(log.contains("sqlite3_step() has another row ready "));

    OxQelConnectionSQLite never;
    EXPECT_FALSE(never.execute(L"SELECT 1"));
    EXPECT_FALSE(never.execute(L""));
}

TEST(SQLiteConnectionExecute, TextEndingInBlanksOrCommentsFinishes) {
    Database db("CREATE TABLE t(a);");
    OxQelConnectionSQLite& c = db.connection();
    EXPECT_TRUE(c.execute(L"INSERT INTO t VALUES (1);   \n\t "));
    EXPECT_TRUE(c.execute(L"INSERT INTO t VALUES (2); -- the end"));
    EXPECT_TRUE(c.execute(L"INSERT INTO t VALUES (3); /* a note */ ;; "));
    EXPECT_TRUE(c.execute(L"-- only a comment"));
    EXPECT_TRUE(c.execute(L";"));
    EXPECT_EQ(db.raw().scalar("SELECT group_concat(a) FROM t"), "1,2,3");
}

TEST(SQLiteConnectionTransaction, IsFlatAndEndsAsAsked) {
    Database db("CREATE TABLE t(a);");
    OxQelConnectionSQLite& c = db.connection();
    EXPECT_FALSE(c.closeTransaction());
    EXPECT_FALSE(c.rollbackTransaction(true));

    ASSERT_TRUE(c.startTransaction());
    EXPECT_FALSE(c.startTransaction()) << "a second start is refused";
    EXPECT_TRUE(c.isInTransaction());
    EXPECT_TRUE(c.execute(L"INSERT INTO t VALUES (1)"));
    EXPECT_TRUE(c.rollbackTransaction(false));
    EXPECT_FALSE(c.isInTransaction());
    EXPECT_EQ(db.raw().scalar("SELECT count(*) FROM t"), "0");

    ASSERT_TRUE(c.startTransaction());
    EXPECT_TRUE(c.execute(L"INSERT INTO t VALUES (2)"));
    EXPECT_TRUE(c.closeTransaction());
    EXPECT_EQ(db.raw().scalar("SELECT count(*) FROM t"), "1");

    // Closing ends the engine's transaction; the reopened connection can start anew.
    ASSERT_TRUE(c.startTransaction());
    EXPECT_TRUE(c.closeDatabase());
    EXPECT_FALSE(c.isInTransaction());
    ASSERT_TRUE(c.openConnection(db.wpath(), L"", L"", L""));
    EXPECT_TRUE(c.startTransaction());
    EXPECT_TRUE(c.closeTransaction());
}

TEST(SQLiteConnectionErrors, LastErrorIsMappedToTheLibraryClasses) {
    OxQelConnectionSQLite never;
    EXPECT_EQ(never.getLastError(), OxQel::ErrorUnknown);

    Database db("CREATE TABLE t(id INTEGER PRIMARY KEY, u UNIQUE);");
    OxQelConnectionSQLite& c = db.connection();
    EXPECT_TRUE(c.execute(L"INSERT INTO t VALUES (1, 'x')"));
    EXPECT_EQ(c.getLastError(), OxQel::NoError);
    EXPECT_FALSE(c.execute(L"INSERT INTO t VALUES (2, 'x')"));
    EXPECT_EQ(c.getLastError(), OxQel::ErrorIntegrity);
    EXPECT_FALSE(c.execute(L"INSERT INTO t VALUES ('not a number', 'y')"));
    EXPECT_EQ(c.getLastError(), OxQel::ErrorStatement);
    EXPECT_FALSE(c.execute(L"INSERT INTO missing VALUES (1)"));
    EXPECT_EQ(c.getLastError(), OxQel::ErrorConnection);

    EXPECT_EQ(OxQelConnectionSQLite::_convertSQLiteErrorEnumToStringMessage(0),
              L"Error occured in SQLite");
    EXPECT_EQ(OxQelConnectionSQLite::_convertSQLiteErrorEnumToStringMessage(5),
              L"The database file is locked ");
    EXPECT_EQ(OxQelConnectionSQLite::_convertSQLiteErrorEnumToStringMessage(101),
              L"sqlite3_step() has finished executing ");
}

TEST(SQLiteConnectionFiles, CreateFindAndDropDatabaseFiles) {
    OxTest::TempDir dir;
    const std::wstring path = dir.wfile("new [1].db");
    OxQelConnectionSQLite c;
    EXPECT_FALSE(c.findDatabase(path, L"", L"", L""));
    EXPECT_FALSE(c.createDatabase(L"", L"", L"", L""));
    ASSERT_TRUE(c.createDatabase(path, L"", L"", L""));
    EXPECT_FALSE(c.isOpen());
    EXPECT_TRUE(c.findDatabase(path, L"", L"", L"")) << "brackets are not a pattern";
    EXPECT_TRUE(c.findDatabase(dir.wfile("new*.d?"), L"", L"", L""));
    // A new file is a complete database in UTF-16, whatever opens it next.
    EXPECT_TRUE(OxQelConnectionSQLite::_isSQLiteFile(path));
    EXPECT_EQ(RawDb(dir.file("new [1].db")).scalar("PRAGMA encoding"), "UTF-16le");
    EXPECT_EQ(RawDb(dir.file("new [1].db")).scalar("SELECT count(*) FROM sqlite_master"), "0");
    OxTest::writeFile(dir.file("text.db"), std::string(5000, 'x'));
    EXPECT_FALSE(c.createDatabase(dir.wfile("text.db"), L"", L"", L"")) << "no database file";

    // An existing database keeps its content and its header.
    RawDb(dir.file("new [1].db")).exec("CREATE TABLE t(a); PRAGMA user_version=7;");
    ASSERT_TRUE(c.createDatabase(path, L"", L"", L""));
    EXPECT_EQ(RawDb(dir.file("new [1].db")).scalar("PRAGMA user_version"), "7");

    Database other;
    EXPECT_FALSE(other.connection().dropDatabase(path, L"", L"", L"")) << "open: refused";
    EXPECT_TRUE(c.dropDatabase(path, L"", L"", L""));
    EXPECT_FALSE(std::filesystem::exists(dir.file("new [1].db")));
    EXPECT_FALSE(c.dropDatabase(path, L"", L"", L""));
    EXPECT_FALSE(c.dropDatabase(dir.path().wstring(), L"", L"", L"")) << "never a folder";
}

TEST(SQLiteConnectionFactories, MakeObjectsOfTheBackend) {
    OxQelConnectionSQLite closed;
    EXPECT_EQ(closed.createNewConnection(), nullptr);
    EXPECT_EQ(closed.createOxQelIPrepraredQuery(), nullptr);

    Database db("CREATE TABLE t(a); INSERT INTO t VALUES (42);");
    std::unique_ptr<OxQelIConnection> second(db.connection().createNewConnection());
    ASSERT_NE(second, nullptr);
    EXPECT_NE(OxQelConnectionSQLite::cast(second.get()), nullptr);
    EXPECT_EQ(second->getConnectionParameter().getDatabase(), db.wpath());
    EXPECT_TRUE(second->findTable(L"t"));

    std::unique_ptr<OxQelIRecordset> rs(second->createOxQelIRecordset());
    ASSERT_NE(rs, nullptr);
    ASSERT_TRUE(rs->openSQL(second.get(), L"SELECT a FROM t"));
    EXPECT_EQ(rs->getlFieldString(0), L"42");
    std::unique_ptr<OxQelIPreparedQuery> query(second->createOxQelIPrepraredQuery());
    EXPECT_NE(query, nullptr);
    EXPECT_EQ(OxQelIConnection::cast(rs.get()), nullptr);
}
