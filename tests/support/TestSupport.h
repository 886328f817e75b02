#pragma once

#include <filesystem>
#include <string>

#include "platform/core/OxUserLocale.h"

// Helpers every suite shares: the shared test files and private temporary folders.
namespace OxTest {
// A file of the shared test data ("sqlite/Chinook_Sqlite.sqlite"); the test fails when
// the folder is missing.
std::filesystem::path testdata(const std::string& relative);

// A fresh folder removed with everything in it when the object goes.
class TempDir {
public:
    TempDir();
    ~TempDir();
    TempDir(const TempDir&) = delete;
    TempDir& operator=(const TempDir&) = delete;

    const std::filesystem::path& path() const { return m_path; }
    std::filesystem::path file(const std::string& name) const { return m_path / name; }
    std::wstring wfile(const std::string& name) const { return file(name).wstring(); }

private:
    std::filesystem::path m_path;
};

// Sets the user locale by name ("de_DE.UTF-8") and restores the previous one.
class ScopedLocale {
public:
    explicit ScopedLocale(const char* name);
    ~ScopedLocale();
    ScopedLocale(const ScopedLocale&) = delete;
    ScopedLocale& operator=(const ScopedLocale&) = delete;
    void use(const char* name);

private:
    OxUserLocale m_saved;
};

std::string readFile(const std::filesystem::path& path);
void writeFile(const std::filesystem::path& path, const std::string& content);
}  // namespace OxTest
