#include "platform/odbc/OdbcTestEnv.h"

#include <cstdlib>
#include <fstream>

#include "platform/core/OxText.h"

namespace OdbcTest {
namespace {
std::map<std::string, std::string> readEnvFile(const std::filesystem::path& path) {
    std::map<std::string, std::string> values;
    std::ifstream in(path);
    std::string line;
    while (std::getline(in, line)) {
        const size_t eq = line.find('=');
        if (eq != std::string::npos && eq > 0)
            values[line.substr(0, eq)] = line.substr(eq + 1);
    }
    return values;
}

// A configuration written for this process alone, removed when it ends.
struct OwnConfig {
    std::filesystem::path dir;
    OwnConfig() {
        std::string tmpl = (std::filesystem::temp_directory_path() / "oxqel-odbc-XXXXXX").string();
        if (::mkdtemp(tmpl.data()))
            dir = tmpl;
    }
    ~OwnConfig() {
        std::error_code ec;
        if (!dir.empty())
            std::filesystem::remove_all(dir, ec);
    }
};
}  // namespace

Env::Env() {
    const char* file = std::getenv("OXQEL_ODBC_ENV");
    if (file && *file) {
        m_fromFixture = true;
        m_values = readEnvFile(file);
        if (m_values.empty())
            ADD_FAILURE() << "the ODBC test fixture left no file " << file;
    } else {
        static OwnConfig own;
        const std::string command = std::string(OXQEL_SOURCE_DIR) +
                                    "/scripts/testservers/odbc-config '" + own.dir.string() +
                                    "' >/dev/null";
        if (own.dir.empty() || std::system(command.c_str()) != 0)
            ADD_FAILURE() << "could not write a private ODBC configuration";
        m_values = readEnvFile(own.dir / "odbc.env");
    }
    m_configDir = value("ODBCSYSINI");
    // Never the machine's files nor a user's ~/.odbc.ini.
    ::setenv("ODBCSYSINI", value("ODBCSYSINI").c_str(), 1);
    ::setenv("ODBCINI", value("ODBCINI").c_str(), 1);
}

const Env& Env::get() {
    static const Env env;
    return env;
}

std::string Env::value(const std::string& key) const {
    const auto it = m_values.find(key);
    return it == m_values.end() ? std::string() : it->second;
}

std::wstring Env::postgresHost() const {
    return OxText::fromUtf8("DRIVER={PostgreSQL Unicode};SERVER=" + value("PG_HOST") +
                            ";PORT=" + value("PG_PORT"));
}

std::wstring Env::postgresDatabase() const {
    return OxText::fromUtf8(value("PG_DATABASE"));
}

std::wstring Env::postgresUser() const {
    return OxText::fromUtf8(value("PG_USER"));
}

std::wstring Env::postgresPassword() const {
    return OxText::fromUtf8(value("PG_PASSWORD"));
}

std::wstring Env::postgresConnect() const {
    return postgresHost() + L";DATABASE=" + postgresDatabase() + L";UID=" + postgresUser() +
           L";PWD=" + postgresPassword();
}

std::wstring sqliteConnect(const std::filesystem::path& file, const std::wstring& driver) {
    return L"DRIVER={" + driver + L"};DATABASE=" + file.wstring();
}
}  // namespace OdbcTest
