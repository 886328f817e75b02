#include <gtest/gtest.h>

#include <filesystem>

#include "OxClasses/OxFileInfo.h"
#include "OxClasses/OxPath.h"
#include "OxClasses/OxUtString.h"
#include "support/TestSupport.h"

namespace {
TEST(PathTest, CopyReplacesOnlyWithACompleteFile) {
    OxTest::TempDir dir;
    OxTest::writeFile(dir.file("a.txt"), "first");
    EXPECT_TRUE(OxPath::pathFileExists(dir.wfile("a.txt")));
    EXPECT_FALSE(OxPath::pathFileExists(dir.path().wstring()));  // a folder is not a file
    ASSERT_TRUE(OxPath::copyFile(dir.wfile("a.txt"), dir.wfile("b.txt"), 0));
    EXPECT_EQ(OxTest::readFile(dir.file("b.txt")), "first");
    OxTest::writeFile(dir.file("a.txt"), "second");
    EXPECT_FALSE(OxPath::copyFile(dir.wfile("a.txt"), dir.wfile("b.txt"), 1));
    EXPECT_EQ(OxTest::readFile(dir.file("b.txt")), "first");
    EXPECT_TRUE(OxPath::copyFile(dir.wfile("a.txt"), dir.wfile("b.txt"), 0));
    EXPECT_EQ(OxTest::readFile(dir.file("b.txt")), "second");
    EXPECT_FALSE(OxPath::copyFile(dir.wfile("missing"), dir.wfile("c.txt"), 0));
    EXPECT_FALSE(OxPath::pathFileExists(dir.wfile("c.txt")));
    // A file copied onto itself (also through a link) would be lost: refused.
    std::filesystem::create_symlink(dir.file("a.txt"), dir.file("link.txt"));
    EXPECT_TRUE(OxPath::isSameFile(dir.wfile("a.txt"), dir.wfile("link.txt")));
    EXPECT_FALSE(OxPath::copyFile(dir.wfile("a.txt"), dir.wfile("link.txt"), 0));
    EXPECT_EQ(OxTest::readFile(dir.file("a.txt")), "second");
    EXPECT_EQ(std::distance(std::filesystem::directory_iterator(dir.path()), {}),
              3);  // no temp left
    EXPECT_TRUE(OxPath::deleteFile(dir.wfile("b.txt")));
    EXPECT_TRUE(OxPath::deleteFile(dir.wfile("b.txt")));
}

TEST(PathTest, ChangeFileExt) {
    EXPECT_EQ(OxPath::changeFileExt(L"/d/x.sqlite", L".mdb"), L"/d/x.mdb");
    EXPECT_EQ(OxPath::changeFileExt(L"/d.v/x", L".xls"), L"/d.v/x.xls");
    EXPECT_EQ(OxPath::changeFileExt(L"/d/.hidden", L".mdb"), L"/d/.hidden.mdb");
    EXPECT_EQ(OxPath::changeFileExt(L"a.b.c", L".sqlite"), L"a.b.sqlite");
}

TEST(FileInfoTest, KindsByHeader) {
    using F = OxFileInfo;
    EXPECT_EQ(F::_getFileType(OxTest::testdata("sqlite/Chinook_Sqlite.sqlite").wstring()),
              F::FileSQLite3);
    EXPECT_EQ(F::_getFileType(OxTest::testdata("access/jet4_queryTestV2003.mdb").wstring()),
              F::FileAccessJet);
    EXPECT_EQ(F::_getFileType(OxTest::testdata("access/jet3_indexTestV1997.mdb").wstring()),
              F::FileAccessJet);
    EXPECT_EQ(F::_getFileType(OxTest::testdata("access/ace14_testV2010.accdb").wstring()),
              F::FileAccessAce);
    EXPECT_EQ(F::_getFileType(OxTest::testdata("xls/date.xls").wstring()), F::FileCompound);
    EXPECT_EQ(F::_getFileType(OxTest::testdata("xlsx/date.xlsx").wstring()), F::FileZipPackage);
    EXPECT_EQ(F::_getFileType(OxTest::testdata("xls/as3xls_BIFF2.xls").wstring()),
              F::FileBiffStream);
    OxTest::TempDir dir;
    OxTest::writeFile(dir.file("empty"), "");
    OxTest::writeFile(dir.file("short"), "SQLite");
    EXPECT_EQ(F::_getFileType(dir.wfile("empty")), F::FileEmpty);
    EXPECT_EQ(F::_getFileType(dir.wfile("short")), F::FileUnknown);
    EXPECT_EQ(F::_getFileType(dir.wfile("none")), F::FileMissing);
    EXPECT_EQ(F::_getFileType(dir.path().wstring()), F::FileMissing);
}

TEST(UtStringTest, UnicodeFileCreatesThenAppends) {
    OxTest::TempDir dir;
    const std::wstring path = dir.wfile("log.txt");
    EXPECT_TRUE(OxUtString::writeStringArrayToUnicodeFile(path, {L"\u00e9 one\n"}, false));
    EXPECT_TRUE(OxUtString::writeStringArrayToUnicodeFile(path, {L"two", L"three\n"}, true));
    EXPECT_EQ(OxTest::readFile(dir.file("log.txt")), "\xC3\xA9 one\ntwo\nthree\n");
    EXPECT_TRUE(OxUtString::writeStringArrayToUnicodeFile(path, {L"new"}, false));
    EXPECT_EQ(OxTest::readFile(dir.file("log.txt")), "new\n");
    EXPECT_FALSE(
        OxUtString::writeStringArrayToUnicodeFile(dir.wfile("no/such/dir"), {L"x"}, false));
    EXPECT_EQ(OxUtString::LPCSTR_TO_LPCTSTR("\xE4\xB8\xAD"), L"\u4e2d");
    EXPECT_EQ(OxUtString::LPCSTR_TO_LPCTSTR(nullptr), L"");
}
}  // namespace
