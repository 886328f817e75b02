#include "support/TestSupport.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <fstream>
#include <sstream>
#include <stdexcept>

namespace OxTest {
std::filesystem::path testdata(const std::string& relative) {
    const std::filesystem::path dir = OXQEL_TESTDATA_DIR;
    if (dir.empty() || !std::filesystem::exists(dir / "README.md"))
        ADD_FAILURE() << "shared test data not found (set OXQEL_TESTDATA_DIR)";
    return dir / relative;
}

TempDir::TempDir() {
    std::string tmpl = (std::filesystem::temp_directory_path() / "oxqel-test-XXXXXX").string();
    if (!::mkdtemp(tmpl.data()))
        throw std::runtime_error("mkdtemp failed");
    m_path = tmpl;
}

TempDir::~TempDir() {
    std::error_code ec;
    std::filesystem::remove_all(m_path, ec);
}

ScopedLocale::ScopedLocale(const char* name) : m_saved(OxUserLocale::current()) {
    use(name);
}
ScopedLocale::~ScopedLocale() {
    OxUserLocale::setCurrent(m_saved);
}
void ScopedLocale::use(const char* name) {
    OxUserLocale::setCurrent(OxUserLocale::fromName(name));
}

std::string readFile(const std::filesystem::path& path) {
    std::ifstream in(path, std::ios::binary);
    std::ostringstream s;
    s << in.rdbuf();
    return s.str();
}

void writeFile(const std::filesystem::path& path, const std::string& content) {
    std::ofstream out(path, std::ios::binary | std::ios::trunc);
    out << content;
}
}  // namespace OxTest
