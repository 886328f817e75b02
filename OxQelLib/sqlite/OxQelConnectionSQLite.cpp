#define OXQEL_SOURCE_FILE L"OxQelLib/OxQelConnectionSQLite"

#include "OxQelLib/sqlite/OxQelConnectionSQLite.h"

#include <glob.h>
#include <sqlite3.h>
#include <unistd.h>

#include <filesystem>
#include <map>

#include "OxClasses/OxFileInfo.h"
#include "OxQelLib/foundation/OxQelLog.h"
#include "OxQelLib/foundation/OxQelQueryText.h"
#include "OxQelLib/sqlite/OxQelPreparedQuerySQLite.h"
#include "OxQelLib/sqlite/OxQelRecordsetSQLite.h"
#include "OxQelLib/sqlite/OxQelSQLiteStatement.h"
#include "platform/core/OxFormat.h"
#include "platform/core/OxText.h"

OX_IMPLEMENT_DYNAMIC(OxQelConnectionSQLite, OxQelIConnection)

const unsigned char OxQelConnectionSQLite::_mSQLite3FileSignature[16] = {
    'S', 'Q', 'L', 'i', 't', 'e', ' ', 'f', 'o', 'r', 'm', 'a', 't', ' ', '3', 0};

namespace {
// Natural-sort key over any code unit type: the digits are ASCII in every encoding, so
// UTF-8, UTF-16 and UTF-32 text give the same key in their own units.
template <class C>
bool isDigit(C c) {
    return c >= C('0') && c <= C('9');
}

// The most units a key of n units can take: every digit run gains at least three.
size_t naturalKeyBound(size_t n) {
    return n + 3 * ((n + 1) / 2) + 10 * (n / 1000 + 1) + 8;
}

template <class C>
size_t naturalKey(const C* text, size_t n, C* out) {
    C* o = out;
    size_t i = 0;
    while (i < n) {
        size_t j = i;
        if (isDigit(text[i])) {
            while (j < n && isDigit(text[j])) ++j;
            // "%03d" of the run's length.
            char digits[24];
            size_t len = j - i;
            int k = 0;
            do {
                digits[k++] = static_cast<char>('0' + len % 10);
                len /= 10;
            } while (len);
            while (k < 3) digits[k++] = '0';
            while (k) *o++ = C(digits[--k]);
        } else {
            while (j < n && !isDigit(text[j])) ++j;
        }
        for (size_t m = i; m < j; ++m) *o++ = text[m];
        i = j;
    }
    return static_cast<size_t>(o - out);
}

template <class C>
void setNaturalKeyResult(sqlite3_context* context, const C* text, size_t n) {
    auto* key = static_cast<C*>(sqlite3_malloc64(naturalKeyBound(n) * sizeof(C)));
    if (!key) {
        sqlite3_result_error_nomem(context);
        return;
    }
    const size_t len = naturalKey(text ? text : reinterpret_cast<const C*>(L""), n, key);
    if constexpr (sizeof(C) == 2)
        sqlite3_result_text16(context, key, static_cast<int>(len * 2), sqlite3_free);
    else
        sqlite3_result_text(context, reinterpret_cast<const char*>(key), static_cast<int>(len),
                            sqlite3_free);
}

// The SQL function over text in units of C: UTF-8 for databases kept in UTF-8, so that
// their texts need no detour through UTF-16.
template <class C>
void naturalSortFunction(sqlite3_context* context, int count, sqlite3_value** values) {
    if (count < 1) {
        sqlite3_result_null(context);
        return;
    }
    switch (sqlite3_value_type(values[0])) {
        case SQLITE_INTEGER:
            sqlite3_result_int64(context, sqlite3_value_int64(values[0]));
            return;
        case SQLITE_TEXT:
            if constexpr (sizeof(C) == 2)
                setNaturalKeyResult(context, static_cast<const C*>(sqlite3_value_text16(values[0])),
                                    static_cast<size_t>(sqlite3_value_bytes16(values[0])) / 2);
            else
                setNaturalKeyResult(context,
                                    reinterpret_cast<const C*>(sqlite3_value_text(values[0])),
                                    static_cast<size_t>(sqlite3_value_bytes(values[0])));
            return;
        default:
            sqlite3_result_null(context);
            return;
    }
}

bool isSpace(wchar_t c) {
    return c == L' ' || (c >= L'\t' && c <= L'\r');
}

size_t skipSpaces(const std::wstring& s, size_t i) {
    while (i < s.size() && isSpace(s[i])) ++i;
    return i;
}

size_t skipDigits(const std::wstring& s, size_t i) {
    while (i < s.size() && s[i] >= L'0' && s[i] <= L'9') ++i;
    return i;
}

// The first match of (\s+(TOP)\s*(\((\d+)\)))|(\s+(TOP)\s+(\d+)), case-insensitive,
// without a backtracking engine: a whitespace run is always taken whole, so the match
// can only start where a run starts. Gives the match and its digits.
bool findTopClause(const std::wstring& s, size_t& begin, size_t& end, std::wstring& digits) {
    for (size_t i = 0; i < s.size(); ++i) {
        if (!isSpace(s[i]) || (i > 0 && isSpace(s[i - 1])))
            continue;
        const size_t t = skipSpaces(s, i);
        if (t + 3 > s.size() || !OxText::equalsNoCase(std::wstring_view(s).substr(t, 3), L"TOP"))
            continue;
        const size_t afterTop = t + 3;
        const size_t open = skipSpaces(s, afterTop);
        if (open < s.size() && s[open] == L'(') {
            const size_t d = skipDigits(s, open + 1);
            if (d > open + 1 && d < s.size() && s[d] == L')') {
                begin = i;
                end = d + 1;
                digits = s.substr(open + 1, d - open - 1);
                return true;
            }
        }
        if (open > afterTop) {
            const size_t d = skipDigits(s, open);
            if (d > open) {
                begin = i;
                end = d;
                digits = s.substr(open, d - open);
                return true;
            }
        }
    }
    return false;
}

std::wstring temporaryName(const std::wstring& name) {
    if (name.size() > 5 && OxText::equalsNoCase(std::wstring_view(name).substr(0, 5), L"temp."))
        return name;
    return L"temp." + name;
}

// The file search of the platform: * and ? are wildcards, everything else literal.
bool fileSearch(const std::wstring& pattern) {
    if (pattern.empty())
        return false;
    std::wstring escaped;
    for (wchar_t c : pattern) {
        if (c == L'[' || c == L']' || c == L'\\')
            escaped.push_back(L'\\');
        escaped.push_back(c);
    }
    glob_t found{};
    const int rc = ::glob(OxText::toUtf8(escaped).c_str(), 0, nullptr, &found);
    const bool any = rc == 0 && found.gl_pathc > 0;
    ::globfree(&found);
    return any;
}
}  // namespace

OxQelConnectionSQLite::~OxQelConnectionSQLite() {
    closeDatabase();
    // An engine that refused to close still has its handle released.
    if (m_handle)
        sqlite3_close_v2(m_handle);
}

std::wstring OxQelConnectionSQLite::_convertSQLiteErrorEnumToStringMessage(int code) {
    return OxQelSQLiteStatement::OxQelSQLiteStatement::message(code);
}

bool OxQelConnectionSQLite::_isSQLiteFile(const std::wstring& path) {
    return OxFileInfo::_getFileType(path) == OxFileInfo::FileSQLite3;
}

int OxQelConnectionSQLite::busyHandler(void*, int tries) {
    if (tries >= _miMaxRetryCount)
        return 0;
    sqlite3_sleep(_miMaxRetryTimeout);
    return 1;
}

// ---------------------------------------------------------------- lifecycle

bool OxQelConnectionSQLite::openHandle(const std::wstring& database, const wchar_t* function) {
    const std::u16string path = OxText::toUtf16(database);
    const int rc = sqlite3_open16(path.c_str(), &m_handle);
    if (rc != SQLITE_OK) {
        OXQEL_REPORT(OxQelSQLiteStatement::message(rc), function, database);
        closeHandle();
        return false;
    }
    // The engine opens lazily: a file that is no database, or whose schema is damaged,
    // fails here instead of at the caller's first statement.
    sqlite3_busy_handler(m_handle, busyHandler, nullptr);
    OxQelSQLiteStatement probe;
    int probed = probe.prepare(m_handle, std::string_view("SELECT count(*) FROM sqlite_master"));
    if (probed == SQLITE_OK)
        probed = probe.step();
    probe.finalize();
    if (probed != SQLITE_ROW && probed != SQLITE_BUSY && probed != SQLITE_LOCKED) {
        OXQEL_REPORT(OxQelSQLiteStatement::message(probed), function, database);
        closeHandle();
        return false;
    }
    OxQelSQLiteStatement encoding;
    m_utf16 = false;
    if (encoding.prepare(m_handle, std::string_view("PRAGMA encoding")) == SQLITE_OK &&
        encoding.step() == SQLITE_ROW)
        m_utf16 = encoding.columnText(0).rfind(L"UTF-16", 0) == 0;
    return true;
}

bool OxQelConnectionSQLite::backupDatabaseTo(const std::wstring& path) {
    const wchar_t* function = L"OxQelConnectionSQLite::backupDatabaseTo";
    if (!m_isOpen || !m_handle || path.empty())
        return false;
    const std::string target = OxText::toUtf8(path);
    std::string temporary = target + ".oxtmp-XXXXXX";
    const int fd = ::mkstemp(temporary.data());
    if (fd < 0) {
        OXQEL_REPORT(L"cannot create a file beside the destination", function, path);
        return false;
    }
    ::close(fd);  // the engine takes an empty file as a new database
    sqlite3* copy = nullptr;
    int rc = sqlite3_open_v2(temporary.c_str(), &copy, SQLITE_OPEN_READWRITE, nullptr);
    if (rc == SQLITE_OK) {
        sqlite3_backup* backup = sqlite3_backup_init(copy, "main", m_handle, "main");
        if (!backup) {
            rc = sqlite3_errcode(copy);
        } else {
            // A writer elsewhere may hold the source for a while: wait as every other
            // statement of the connection does.
            int tries = 0;
            do {
                rc = sqlite3_backup_step(backup, -1);
                if (rc == SQLITE_BUSY || rc == SQLITE_LOCKED)
                    sqlite3_sleep(_miMaxRetryTimeout);
            } while ((rc == SQLITE_BUSY || rc == SQLITE_LOCKED || rc == SQLITE_OK) &&
                     ++tries < _miMaxRetryCount);
            const int finished = sqlite3_backup_finish(backup);
            if (rc == SQLITE_DONE)
                rc = finished;
        }
    }
    if (rc == SQLITE_OK || rc == SQLITE_DONE)
        rc = sqlite3_exec(copy, "PRAGMA journal_mode=DELETE", nullptr, nullptr, nullptr);
    const std::wstring failure =
        rc == SQLITE_OK ? std::wstring() : OxQelSQLiteStatement::message(rc);
    if (sqlite3_close(copy) != SQLITE_OK && rc == SQLITE_OK)
        rc = SQLITE_ERROR;
    if (rc != SQLITE_OK) {
        OXQEL_REPORT(failure.empty() ? L"the copy could not be completed" : failure, function,
                     path);
        ::unlink(temporary.c_str());
        return false;
    }
    // Journals of the database that is replaced would be applied to the copy.
    for (const char* suffix : {"-wal", "-shm", "-journal"}) ::unlink((target + suffix).c_str());
    if (::rename(temporary.c_str(), target.c_str()) != 0) {
        OXQEL_REPORT(L"cannot replace the destination file", function, path);
        ::unlink(temporary.c_str());
        return false;
    }
    return true;
}

void OxQelConnectionSQLite::closeHandle() {
    if (m_handle)
        sqlite3_close(m_handle);
    m_handle = nullptr;
    m_isOpen = false;
}

void OxQelConnectionSQLite::optimizeSQLite() {
    execute(L"PRAGMA synchronous=OFF;");
}

void OxQelConnectionSQLite::registerFunctions() {
    int rc = sqlite3_create_function(m_handle, "fn_OxNaturalSort", 1, SQLITE_UTF16, nullptr,
                                     _fn_OxNaturalSort, nullptr, nullptr);
    // The engine picks the form that matches the database's encoding.
    if (rc == SQLITE_OK)
        rc = sqlite3_create_function(m_handle, "fn_OxNaturalSort", 1, SQLITE_UTF8, nullptr,
                                     naturalSortFunction<char>, nullptr, nullptr);
    if (rc != SQLITE_OK)
        OXQEL_REPORT(OxQelSQLiteStatement::message(rc), L"OxQelConnectionSQLite::openConnection",
                     m_parameters.getDatabase());
}

bool OxQelConnectionSQLite::openConnection(const std::wstring& database, const std::wstring& host,
                                           const std::wstring& userId,
                                           const std::wstring& password) {
    return OXQEL_SQLITE_GUARDED(L"OxQelConnectionSQLite::openConnection", [&] {
        closeDatabase();
        if (database.empty())
            return false;
        if (!openHandle(database, L"OxQelConnectionSQLite::openConnection"))
            return false;
        m_isOpen = true;
        m_parameters.clear();
        m_parameters.setDatabase(database);
        m_parameters.setHost(host);
        m_parameters.setUserId(userId);
        m_parameters.setPassword(password);
        optimizeSQLite();
        registerFunctions();
        return m_isOpen;
    });
}

bool OxQelConnectionSQLite::closeDatabase() {
    if (!m_handle || !m_isOpen)
        return true;
    const int rc = sqlite3_close_v2(m_handle);
    if (rc != SQLITE_OK) {
        OXQEL_REPORT(OxQelSQLiteStatement::message(rc), L"OxQelConnectionSQLite::closeDatabase",
                     L"Closing database");
        return false;
    }
    m_handle = nullptr;
    m_isOpen = false;
    // Closing the engine's connection ended any transaction it had.
    m_inTransaction = false;
    return true;
}

bool OxQelConnectionSQLite::findDatabase(const std::wstring& database, const std::wstring&,
                                         const std::wstring&, const std::wstring&) {
    return OXQEL_SQLITE_GUARDED(L"OxQelConnectionSQLite::findDatabase",
                                [&] { return fileSearch(database); });
}

bool OxQelConnectionSQLite::createDatabase(const std::wstring& database, const std::wstring&,
                                           const std::wstring&, const std::wstring&) {
    return OXQEL_SQLITE_GUARDED(L"OxQelConnectionSQLite::createDatabase", [&] {
        closeDatabase();
        if (database.empty())
            return false;
        if (!openHandle(database, L"OxQelConnectionSQLite::createDatabase"))
            return false;
        m_isOpen = true;
        optimizeSQLite();
        // A new file gets its header at once, so it keeps the UTF-16 encoding of the open
        // call whatever program opens it next, and is recognised as a database file.
        OxQelSQLiteStatement pages;
        if (pages.prepare(m_handle, std::string_view("PRAGMA page_count")) == SQLITE_OK &&
            pages.step() == SQLITE_ROW && pages.columnInt(0) == 0) {
            pages.finalize();
            // The encoding is written with the first table; none is left behind.
            execute(L"CREATE TABLE oxqel_new_file(a); DROP TABLE oxqel_new_file; VACUUM;");
        }
        pages.finalize();
        return closeDatabase();
    });
}

bool OxQelConnectionSQLite::dropDatabase(const std::wstring& database, const std::wstring&,
                                         const std::wstring&, const std::wstring&) {
    if (isOpen())
        return false;
    return OXQEL_SQLITE_GUARDED(L"OxQelConnectionSQLite::dropDatabase", [&] {
        std::error_code ec;
        const std::filesystem::path path(OxText::toUtf8(database));
        if (database.empty() || std::filesystem::is_directory(path, ec))
            return false;
        return std::filesystem::remove(path, ec) && !ec;
    });
}

// ---------------------------------------------------------------- execution

bool OxQelConnectionSQLite::execute(const std::wstring& statement) {
    if (!m_handle)
        return false;
    if (statement.empty())
        return true;
    return OXQEL_SQLITE_GUARDED(L"OxQelConnectionSQLite::execute", [&] {
        const std::string sql = OxText::toUtf8(statement);
        const char* rest = sql.data();
        const char* const end = sql.data() + sql.size();
        auto report = [&](int rc, sqlite3_stmt* stmt) {
            std::wstring compiled = OxQelSQLiteStatement::sqlText(stmt);
            if (compiled.empty())
                compiled = L"Empty expression";
            OXQEL_REPORT(OxQelSQLiteStatement::message(rc), L"OxQelConnectionSQLite::execute",
                         oxFormat(L"Expression : %s\nCompiled expression : %s\n%s", statement,
                                  compiled, OxQelSQLiteStatement::errorMessage(m_handle)));
        };
        while (rest < end) {
            OxQelSQLiteStatement stmt;
            const char* tail = nullptr;
            int rc = stmt.prepare(m_handle, std::string_view(rest, static_cast<size_t>(end - rest)),
                                  &tail);
            if (rc != SQLITE_OK) {
                report(rc, nullptr);
                return false;
            }
            if (!tail || tail <= rest)
                return true;
            rest = tail;
            // White space, a comment or a lone semicolon compiles to no statement.
            if (!stmt)
                continue;
            rc = stmt.step();
            if (rc != SQLITE_DONE) {
                report(rc, stmt.get());
                const int reset = stmt.reset();
                if (reset != SQLITE_OK && reset != rc)
                    OXQEL_REPORT(OxQelSQLiteStatement::message(reset),
                                 L"OxQelConnectionSQLite::execute",
                                 oxFormat(L"%s\n%s", statement,
                                          OxQelSQLiteStatement::errorMessage(m_handle)));
                return false;
            }
            rc = stmt.finalize();
            if (rc != SQLITE_OK) {
                report(rc, nullptr);
                return false;
            }
        }
        return true;
    });
}

bool OxQelConnectionSQLite::startTransaction() {
    if (!isOpen() || m_inTransaction)
        return false;
    const bool ok = execute(L"BEGIN TRANSACTION");
    if (ok)
        m_inTransaction = true;
    return ok;
}

bool OxQelConnectionSQLite::closeTransaction() {
    if (!isOpen() || !m_inTransaction)
        return false;
    const bool ok = execute(L"END TRANSACTION");
    if (ok)
        m_inTransaction = false;
    return ok;
}

bool OxQelConnectionSQLite::rollbackTransaction(bool) {
    if (!isOpen() || !m_inTransaction)
        return false;
    const bool ok = execute(L"ROLLBACK TRANSACTION");
    if (ok)
        m_inTransaction = false;
    return ok;
}

OxQel::SQLError OxQelConnectionSQLite::getLastError() {
    if (!m_handle)
        return OxQel::ErrorUnknown;
    switch (sqlite3_errcode(m_handle) & 0xFF) {
        case SQLITE_OK:
        case SQLITE_ROW:
        case SQLITE_DONE:
            return OxQel::NoError;
        case SQLITE_ERROR:
        case SQLITE_PERM:
        case SQLITE_BUSY:
        case SQLITE_CANTOPEN:
        case SQLITE_NOTADB:
            return OxQel::ErrorConnection;
        case SQLITE_EMPTY:
        case SQLITE_TOOBIG:
        case SQLITE_MISMATCH:
        case SQLITE_FORMAT:
        case SQLITE_RANGE:
            return OxQel::ErrorStatement;
        case SQLITE_CONSTRAINT:
            return OxQel::ErrorIntegrity;
        default:
            return OxQel::ErrorUnknown;
    }
}

OxQelIConnection* OxQelConnectionSQLite::createNewConnection() {
    return OXQEL_SQLITE_GUARDED(L"OxQelConnectionSQLite::createNewConnection",
                                [&]() -> OxQelIConnection* {
                                    auto* connection = new OxQelConnectionSQLite();
                                    const OxConnectionParameter p = m_parameters;
                                    if (connection->openConnection(p.getDatabase(), p.getHost(),
                                                                   p.getUserId(), p.getPassword()))
                                        return connection;
                                    delete connection;
                                    return nullptr;
                                });
}

OxQelIRecordset* OxQelConnectionSQLite::createOxQelIRecordset() {
    return OXQEL_SQLITE_GUARDED(L"OxQelConnectionSQLite::createOxQelIRecordset",
                                []() -> OxQelIRecordset* { return new OxQelRecordsetSQLite(); });
}

OxQelIPreparedQuery* OxQelConnectionSQLite::createOxQelIPrepraredQuery() {
    return OXQEL_SQLITE_GUARDED(L"OxQelConnectionSQLite::createOxQelIPrepraredQuery",
                                [&]() -> OxQelIPreparedQuery* {
                                    auto* query = new OxQelPreparedQuerySQLite();
                                    if (query->setConnection(this))
                                        return query;
                                    delete query;
                                    return nullptr;
                                });
}

// ---------------------------------------------------------------- statement rewriting

std::wstring OxQelConnectionSQLite::formatBeforeExecute(const std::wstring& statement) {
    return OXQEL_SQLITE_GUARDED(L"OxQelConnectionSQLite::formatBeforeExecute", [&] {
        std::wstring text = statement;
        if (text.empty())
            return text;
        if (text.back() == L';')
            text.pop_back();
        text = OxQel::Util::doubleApostrophes(text);
        OxQel::Util::renderMarkers(text, {L" '", L"' ", L"  '", L"'  "});
        _replaceTopByLimit(text);
        return text;
    });
}

bool OxQelConnectionSQLite::_replaceTopByLimit(std::wstring& text) {
    if (OxText::findNoCase(text, L" TOP") == std::wstring::npos)
        return false;
    size_t begin = 0;
    size_t end = 0;
    std::wstring digits;
    if (!findTopClause(text, begin, end, digits) || digits.empty())
        return false;
    text.replace(begin, end - begin, L" ");
    text += L" LIMIT ";
    text += digits;
    return true;
}

std::wstring OxQelConnectionSQLite::escapeQuote(const std::wstring& text) const {
    return OxQel::Util::doubleApostrophes(text);
}

namespace {
bool isExpressionDefault(const std::wstring& value) {
    return value.find(L'(') != std::wstring::npos && value.find(L')') != std::wstring::npos;
}

// The defaults that ALTER TABLE ... ADD COLUMN refuses.
bool isNonConstantDefault(const std::wstring& value) {
    const std::wstring v = OxText::toUpper(OxText::trim(value));
    return isExpressionDefault(v) || v == L"CURRENT_TIMESTAMP" || v == L"CURRENT_DATE" ||
           v == L"CURRENT_TIME";
}
}  // namespace

std::wstring OxQelConnectionSQLite::manageDefaultValue(const std::wstring& defaultValue,
                                                       OxQel::FieldType type,
                                                       bool canBeNull) const {
    const std::wstring typeName = convertEnumFieldType(type);
    std::wstring value = defaultValue;
    for (const wchar_t* mark : {L"]]]", L"[[[", L"]]", L"[["}) OxText::replaceAll(value, mark, L"");
    // An expression keeps its quotes (strftime('%s','now') means nothing without them)
    // and goes between parentheses, as the engine wants it.
    if (isExpressionDefault(value)) {
        value = OxText::trim(value);
        return value.front() == L'(' ? L"DEFAULT " + value : L"DEFAULT (" + value + L")";
    }
    for (const wchar_t* mark : {L"'", L"\""}) OxText::replaceAll(value, mark, L"");
    value = OxText::trim(value);
    if (!value.empty())
        return oxFormat(OxText::equalsNoCase(typeName, L"TEXT") ? L"DEFAULT '%s'" : L"DEFAULT %s",
                        value);
    if (canBeNull)
        return {};
    if (typeName == L"INTEGER")
        return L"DEFAULT 0";
    if (typeName == L"REAL")
        return L"DEFAULT 0.0";
    return L"DEFAULT ''";
}

void OxQelConnectionSQLite::normalizeDefaultValue(std::wstring& value,
                                                  OxQel::FieldType type) const {
    if (value == L"''" || value == L"\"\"")
        value.clear();
    if (convertEnumFieldType(type) == L"TEXT" && !value.empty() && value.front() == L'\'' &&
        value.back() == L'\'')
        value = value.size() < 2 ? std::wstring() : value.substr(1, value.size() - 2);
}

// ---------------------------------------------------------------- natural sort

void OxQelConnectionSQLite::_fn_OxNaturalSort(sqlite3_context* context, int count,
                                              sqlite3_value** values) {
    naturalSortFunction<char16_t>(context, count, values);
}

std::wstring OxQelConnectionSQLite::_getStringForNaturalSort(const std::wstring& text) {
    std::wstring key(naturalKeyBound(text.size()), L'\0');
    key.resize(naturalKey(text.data(), text.size(), key.data()));
    return key;
}

// ---------------------------------------------------------------- schema

std::wstring OxQelConnectionSQLite::convertEnumFieldType(OxQel::FieldType type) const {
    switch (type) {
        case OxQel::Integer:
        case OxQel::Bool:
            return L"INTEGER";
        case OxQel::String:
        case OxQel::WString:
        case OxQel::Date:
        case OxQel::Char:
        case OxQel::WChar:
            return L"TEXT";
        case OxQel::Memo:
        case OxQel::WMemo:
        case OxQel::Binary:
        case OxQel::Guid:
            return L"BLOB";
        case OxQel::Double:
            return L"REAL";
        default:
            return L"NULL";
    }
}

OxQel::FieldType OxQelConnectionSQLite::convertStrFieldType(const std::wstring& type) const {
    if (OxText::equalsNoCase(type, L"INTEGER"))
        return OxQel::Integer;
    if (OxText::equalsNoCase(type, L"TEXT"))
        return OxQel::WString;
    if (OxText::equalsNoCase(type, L"REAL"))
        return OxQel::Double;
    if (OxText::equalsNoCase(type, L"BLOB"))
        return OxQel::Binary;
    return OxQel::Unknown;
}

std::wstring OxQelConnectionSQLite::convertEnumTableType(OxQelTableDef::TableType type) const {
    switch (type) {
        case OxQelTableDef::Table:
            return L"table";
        case OxQelTableDef::View:
            return L"view";
        case OxQelTableDef::Trigger:
            return L"trigger";
        case OxQelTableDef::Index:
            return L"index";
        default:
            return {};
    }
}

OxQelTableDef::TableType OxQelConnectionSQLite::convertEnumTableType(
    const std::wstring& type) const {
    if (OxText::equalsNoCase(type, L"table"))
        return OxQelTableDef::Table;
    if (OxText::equalsNoCase(type, L"view"))
        return OxQelTableDef::View;
    if (OxText::equalsNoCase(type, L"trigger"))
        return OxQelTableDef::Trigger;
    if (OxText::equalsNoCase(type, L"index"))
        return OxQelTableDef::Index;
    return OxQelTableDef::Unknown;
}

std::vector<std::wstring> OxQelConnectionSQLite::split(const std::wstring& text,
                                                       const std::wstring& separators) const {
    std::vector<std::wstring> pieces;
    size_t start = 0;
    while (start < text.size()) {
        const size_t stop = text.find_first_of(separators, start);
        const size_t end = stop == std::wstring::npos ? text.size() : stop;
        if (end > start)
            pieces.push_back(text.substr(start, end - start));
        start = end + 1;
    }
    return pieces;
}

bool OxQelConnectionSQLite::isInVector(const std::vector<std::wstring>& names,
                                       const std::wstring& name) const {
    for (const auto& n : names)
        if (OxText::equalsNoCase(n, name))
            return true;
    return false;
}

std::wstring OxQelConnectionSQLite::fieldClause(const std::wstring& typeName,
                                                const std::wstring& defaultValue,
                                                OxQel::FieldType type, bool canBeNull) const {
    return oxFormat(L"%s %s %s", typeName, manageDefaultValue(defaultValue, type, canBeNull),
                    canBeNull ? L"" : L"NOT NULL");
}

namespace {
// A default value is written into the statement as it stands: one that smuggles in a
// further statement must not run it.
bool isOneStatement(sqlite3* db, const std::wstring& sql) {
    OxQelSQLiteStatement stmt;
    const std::string text = OxText::toUtf8(sql);
    const char* tail = nullptr;
    if (stmt.prepare(db, text, &tail) != SQLITE_OK || !tail)
        return true;  // execute reports the failure
    OxQelSQLiteStatement next;
    const size_t used = static_cast<size_t>(tail - text.data());
    return next.prepare(db, std::string_view(text).substr(used)) == SQLITE_OK && !next;
}
}  // namespace

bool OxQelConnectionSQLite::createTable(const std::wstring& table, const std::wstring& field,
                                        OxQel::FieldType type, int,
                                        const std::wstring& defaultValue, bool canBeNull) {
    if (table.empty() || field.empty())
        return false;
    return OXQEL_SQLITE_GUARDED(L"OxQelConnectionSQLite::createTable", [&] {
        const std::wstring sql = oxFormat(
            L"CREATE TABLE IF NOT EXISTS '%s' ('%s' %s) ", escapeQuote(table), escapeQuote(field),
            fieldClause(convertEnumFieldType(type), defaultValue, type, canBeNull));
        if (m_handle && !isOneStatement(m_handle, sql)) {
            OXQEL_REPORT(L"Invalid default value ", L"OxQelConnectionSQLite::createTable", sql);
            return false;
        }
        return execute(sql);
    });
}

bool OxQelConnectionSQLite::createField(const std::wstring& table, const std::wstring& field,
                                        OxQel::FieldType type, int,
                                        const std::wstring& defaultValue, bool canBeNull) {
    if (!isOpen())
        return false;
    return OXQEL_SQLITE_GUARDED(L"OxQelConnectionSQLite::createField", [&] {
        const std::wstring column =
            oxFormat(L"'%s' %s", escapeQuote(field),
                     fieldClause(convertEnumFieldType(type), defaultValue, type, canBeNull));
        const std::wstring sql =
            oxFormat(L"ALTER TABLE '%s' ADD COLUMN %s", escapeQuote(table), column);
        if (!isOneStatement(m_handle, sql)) {
            OXQEL_REPORT(L"Invalid default value ", L"OxQelConnectionSQLite::createField", sql);
            return false;
        }
        if (isNonConstantDefault(defaultValue))
            return addFieldByRebuild(table, column);
        return execute(sql);
    });
}

bool OxQelConnectionSQLite::deleteTable(const std::wstring& table) {
    return execute(oxFormat(L"DROP TABLE IF EXISTS '%s'", escapeQuote(table)));
}

bool OxQelConnectionSQLite::renameTable(const std::wstring& oldName, const std::wstring& newName) {
    return execute(
        oxFormat(L"ALTER TABLE '%s' RENAME TO '%s'", escapeQuote(oldName), escapeQuote(newName)));
}

bool OxQelConnectionSQLite::renameField(const std::wstring& table, const std::wstring& oldName,
                                        const std::wstring& newName) {
    if (!isOpen())
        return false;
    return execute(oxFormat(L"ALTER TABLE '%s' RENAME COLUMN '%s' TO '%s'", escapeQuote(table),
                            escapeQuote(oldName), escapeQuote(newName)));
}

bool OxQelConnectionSQLite::modifyTable(const std::wstring&, const OxQelFieldDefArray&) {
    return false;
}

bool OxQelConnectionSQLite::resizeFieldString(const std::wstring&, const std::wstring&, long) {
    return false;
}

bool OxQelConnectionSQLite::createIndex(const std::wstring& indexName, bool isPrimaryKey,
                                        bool isUnique, bool, const std::wstring& table,
                                        const std::wstring& fieldList) {
    // The engine reserves "sqlite_" for the indexes of its own constraints; an index copied
    // from one of them keeps the rest of its name.
    const std::wstring name = indexName.rfind(L"sqlite_", 0) == 0 ? indexName.substr(7) : indexName;
    return execute(oxFormat(L"CREATE %s INDEX IF NOT EXISTS '%s' ON '%s' (%s)",
                            isPrimaryKey || isUnique ? L"UNIQUE" : L"", escapeQuote(name),
                            escapeQuote(table), fieldList));
}

bool OxQelConnectionSQLite::deleteIndex(const std::wstring& indexName, bool, const std::wstring&) {
    return execute(oxFormat(L"DROP INDEX IF EXISTS '%s'", escapeQuote(indexName)));
}

bool OxQelConnectionSQLite::createView(std::wstring viewName, std::wstring selectText) {
    return formatAndExecute(oxFormat(L"CREATE VIEW %s AS %s;", viewName, selectText));
}

bool OxQelConnectionSQLite::deleteView(std::wstring viewName) {
    return formatAndExecute(oxFormat(L"DROP VIEW %s;", viewName));
}

template <class OnRow>
bool OxQelConnectionSQLite::readCatalogue(const std::wstring& sql, const wchar_t* function,
                                          OnRow&& onRow) {
    OxQelSQLiteStatement stmt;
    int rc = stmt.prepare(m_handle, sql);
    if (rc == SQLITE_OK) {
        while ((rc = stmt.step()) == SQLITE_ROW)
            if (!onRow(stmt))
                return false;
        // A catalogue cut short by a damaged file is a failure, not a shorter list.
        if (rc == SQLITE_DONE)
            return true;
    }
    OXQEL_REPORT(OxQelSQLiteStatement::message(rc), function,
                 oxFormat(L"%s\n%s", sql, OxQelSQLiteStatement::errorMessage(m_handle)));
    return false;
}

bool OxQelConnectionSQLite::findTable(const std::wstring& table) {
    if (!isOpen())
        return false;
    return OXQEL_SQLITE_GUARDED(L"OxQelConnectionSQLite::findTable", [&] {
        bool found = false;
        readCatalogue(L"SELECT name FROM sqlite_master WHERE type='table'",
                      L"OxQelConnectionSQLite::findTable", [&](const OxQelSQLiteStatement& row) {
                          found = found || OxText::equalsNoCase(row.columnText(0), table);
                          return true;
                      });
        return found;
    });
}

bool OxQelConnectionSQLite::getAllFieldName(const std::wstring& table,
                                            std::vector<std::wstring>& names) {
    if (!isOpen())
        return false;
    return OXQEL_SQLITE_GUARDED(L"OxQelConnectionSQLite::getAllFieldName", [&] {
        names.clear();
        return readCatalogue(oxFormat(L"pragma table_info('%s')", escapeQuote(table)),
                             L"OxQelConnectionSQLite::getAllFieldName",
                             [&](const OxQelSQLiteStatement& row) {
                                 names.push_back(row.columnText(1));
                                 return true;
                             });
    });
}

bool OxQelConnectionSQLite::findField(const std::wstring& table, const std::wstring& field) {
    if (!isOpen())
        return false;
    std::vector<std::wstring> names;
    return getAllFieldName(table, names) && isInVector(names, field);
}

bool OxQelConnectionSQLite::getFieldDef(const std::wstring& table, const std::wstring& fieldList,
                                        OxQelFieldDefArray& fields) {
    if (!isOpen())
        return false;
    return OXQEL_SQLITE_GUARDED(L"OxQelConnectionSQLite::getFieldDef", [&] {
        fields.clear();
        const bool all = OxText::equalsNoCase(fieldList, L"*");
        const std::vector<std::wstring> wanted =
            all ? std::vector<std::wstring>{} : split(fieldList, L",");
        return readCatalogue(oxFormat(L"pragma table_info('%s')", escapeQuote(table)),
                             L"OxQelConnectionSQLite::getFieldDef",
                             [&](const OxQelSQLiteStatement& row) {
                                 const std::wstring name = row.columnText(1);
                                 if (!all && !isInVector(wanted, name))
                                     return true;
                                 OxQelFieldDef def;
                                 def.setFieldName(name);
                                 def.setFieldType(convertStrFieldType(row.columnText(2)));
                                 def.setFieldSize(0);
                                 std::wstring defaultValue = row.columnText(4);
                                 normalizeDefaultValue(defaultValue, def.getFieldType());
                                 def.setDefaultValue(defaultValue);
                                 def.setCanBeNull(row.columnInt(3) == 0);
                                 def.setNoAuto(row.columnInt(5) == 0);
                                 def.setIsPropertiesToGetPtr(fields.getIsPropertiesToGetPtr());
                                 fields.push_back(def);
                                 return true;
                             });
    });
}

bool OxQelConnectionSQLite::getFieldDefByName(const std::wstring& table, const std::wstring& field,
                                              OxQelFieldDef& definition) {
    if (!isOpen() || !findField(table, field))
        return false;
    OxQelFieldDefArray fields;
    if (!getFieldDef(table, field, fields) || fields.size() != 1)
        return false;
    definition = fields.front();
    return true;
}

bool OxQelConnectionSQLite::getTableDef(std::vector<OxQelTableDef>& tables,
                                        OxQelTableDef::TableType mask) {
    if (!isOpen())
        return false;
    return OXQEL_SQLITE_GUARDED(L"OxQelConnectionSQLite::getTableDef", [&] {
        tables.clear();
        // Every object whose kind shares a bit with the mask, so that Table | View gives
        // both; the engine's own objects are listed like the others.
        return readCatalogue(
            L"select * from sqlite_master", L"OxQelConnectionSQLite::getTableDef",
            [&](const OxQelSQLiteStatement& row) {
                OxQelTableDef::TableType type = convertEnumTableType(row.columnText(0));
                // The engine's own tables (sequences, statistics) are
                // system tables: no copy may make them again.
                if (type == OxQelTableDef::Table && row.columnText(1).rfind(L"sqlite_", 0) == 0)
                    type = OxQelTableDef::SystemTable;
                if (mask != OxQelTableDef::AllTypes && (type & mask) == 0)
                    return true;
                OxQelTableDef def;
                def.setTableName(row.columnText(1));
                def.setTableType(type);
                tables.push_back(def);
                return true;
            });
    });
}

bool OxQelConnectionSQLite::getIndexDef(const std::wstring& table,
                                        std::vector<OxQelIndexDef>& indexes) {
    if (!isOpen())
        return false;
    return OXQEL_SQLITE_GUARDED(L"OxQelConnectionSQLite::getIndexDef", [&] {
        indexes.clear();
        return readCatalogue(
            oxFormat(L"PRAGMA index_list ('%s')", escapeQuote(table)),
            L"OxQelConnectionSQLite::getIndexDef", [&](const OxQelSQLiteStatement& row) {
                OxQelIndexDef def;
                def.setTableName(table);
                def.setIndexName(row.columnText(1));
                def.setIsUnique(row.columnInt(2) == 1);
                const bool ok = readCatalogue(
                    oxFormat(L"PRAGMA index_info ( '%s' )", escapeQuote(def.getIndexName())),
                    L"OxQelConnectionSQLite::getIndexDef", [&](const OxQelSQLiteStatement& column) {
                        def.addFieldName(column.columnText(2));
                        return true;
                    });
                if (ok)
                    indexes.push_back(def);
                return ok;
            });
    });
}

bool OxQelConnectionSQLite::deleteField(const std::wstring& table, const std::wstring& field) {
    if (!isOpen())
        return false;
    return OXQEL_SQLITE_GUARDED(L"OxQelConnectionSQLite::deleteField",
                                [&] { return rebuildTableWithout(table, field); });
}

bool OxQelConnectionSQLite::rebuildTableWithout(const std::wstring& table,
                                                const std::wstring& field) {
    OxQelFieldDefArray all;
    getFieldDef(table, L"*", all);
    OxQelFieldDefArray kept;
    std::wstring columns;
    for (const auto& def : all) {
        if (OxText::equalsNoCase(def.getRefFieldName(), field))
            continue;
        kept.push_back(def);
        columns += L"," + oxSQLiteQuoteIdentifier(def.getRefFieldName());
    }
    if (kept.empty())
        return false;
    columns.erase(0, 1);

    startTransaction();
    const std::wstring temporary = oxFormat(L"%s_tmpTable", table);
    // In legacy mode the rename leaves views and triggers of other objects naming the
    // table alone, so they find the rebuilt table afterwards.
    execute(L"PRAGMA legacy_alter_table=ON;");
    const bool renamed = renameTable(table, temporary);
    execute(L"PRAGMA legacy_alter_table=OFF;");
    if (!renamed) {
        rollbackTransaction(true);
        return false;
    }
    const OxQelFieldDef& first = kept.front();
    bool ok = createTable(table, first.getRefFieldName(), first.getFieldType(),
                          first.getFieldSize(), first.getDefaultValue(), first.getCanBeNull());
    for (size_t i = 1; ok && i < kept.size(); ++i)
        ok = createField(table, kept[i].getRefFieldName(), kept[i].getFieldType(),
                         kept[i].getFieldSize(), kept[i].getDefaultValue(), kept[i].getCanBeNull());
    ok = ok && execute(oxFormat(L"INSERT INTO '%s' (%s) SELECT %s FROM '%s'", escapeQuote(table),
                                columns, columns, escapeQuote(temporary)));
    ok = ok && deleteTable(temporary);
    if (!ok) {
        rollbackTransaction(true);
        return false;
    }
    closeTransaction();
    return true;
}

bool OxQelConnectionSQLite::addFieldByRebuild(const std::wstring& table,
                                              const std::wstring& columnDefinition) {
    const wchar_t* function = L"OxQelConnectionSQLite::createField";
    std::wstring createSql;
    std::vector<std::wstring> dependents;  // indexes and triggers, made again afterwards
    const bool read = readCatalogue(
        oxFormat(L"SELECT type, sql FROM sqlite_master WHERE tbl_name = '%s' AND sql IS NOT NULL",
                 escapeQuote(table)),
        function, [&](const OxQelSQLiteStatement& row) {
            (row.columnText(0) == L"table" ? createSql : dependents.emplace_back()) =
                row.columnText(1);
            return true;
        });
    const size_t close = createSql.rfind(L')');
    std::vector<std::wstring> names;
    if (!read || close == std::wstring::npos || !getAllFieldName(table, names))
        return false;
    createSql.insert(close, L", " + columnDefinition);
    std::wstring columns;
    for (const auto& name : names)
        columns += (columns.empty() ? L"" : L",") + oxSQLiteQuoteIdentifier(name);
    const std::wstring aside = table + L"_oxrebuild";
    // A savepoint nests inside the caller's transaction as well as outside one.
    if (!execute(L"SAVEPOINT oxrebuild"))
        return false;
    execute(L"PRAGMA legacy_alter_table=ON;");
    bool ok = renameTable(table, aside);
    execute(L"PRAGMA legacy_alter_table=OFF;");
    ok = ok && execute(createSql) &&
         execute(oxFormat(L"INSERT INTO '%s' (%s) SELECT %s FROM '%s'", escapeQuote(table), columns,
                          columns, escapeQuote(aside))) &&
         deleteTable(aside);
    for (size_t i = 0; ok && i < dependents.size(); ++i) ok = execute(dependents[i]);
    if (!ok)
        execute(L"ROLLBACK TO oxrebuild");
    execute(L"RELEASE oxrebuild");
    return ok;
}

bool OxQelConnectionSQLite::modifyFieldType(const std::wstring& table, const std::wstring& field,
                                            const OxQelFieldDef& definition) {
    if (!isOpen())
        return false;
    return OXQEL_SQLITE_GUARDED(L"OxQelConnectionSQLite::modifyFieldType", [&] {
        OxQelFieldDef old;
        if (!getFieldDefByName(table, field, old))
            return false;
        startTransaction();
        const std::wstring aside = field + L"_rename";
        const bool ok = renameField(table, field, aside) &&
                        createField(table, definition.getRefFieldName(), definition.getFieldType(),
                                    definition.getFieldSize(), definition.getDefaultValue(),
                                    definition.getCanBeNull()) &&
                        execute(oxFormat(L"UPDATE %s SET %s = %s", oxSQLiteQuoteIdentifier(table),
                                         oxSQLiteQuoteIdentifier(definition.getRefFieldName()),
                                         oxSQLiteQuoteIdentifier(aside))) &&
                        deleteField(table, aside);
        if (!ok) {
            rollbackTransaction(true);
            return false;
        }
        // The flat transaction was already committed by the rebuild of deleteField.
        closeTransaction();
        return true;
    });
}

// ---------------------------------------------------------------- temporary tables

std::wstring OxQelConnectionSQLite::formatTemporaryTable(const std::wstring& tableName,
                                                         OxQel::FieldType type,
                                                         const std::wstring& joinedValues) {
    std::wstring sql = oxFormat(L"DROP TABLE IF EXISTS %s; CREATE TEMPORARY TABLE %s ( val %s );",
                                temporaryName(tableName), tableName, convertEnumFieldType(type));
    if (!joinedValues.empty())
        sql += oxFormat(L"\nINSERT INTO %s VALUES (]]", tableName) + joinedValues + L"[[);";
    return sql;
}

template <class TextAt>
std::wstring OxQelConnectionSQLite::temporaryTableStatement(const std::wstring& tableName,
                                                            OxQel::FieldType type, size_t count,
                                                            TextAt textAt) {
    // The values become escaped literals here rather than markers: a value holding a
    // marker or a TOP must not change the statement.
    std::wstring sql = formatTemporaryTable(tableName, type, L"");
    const long perInsert = getMaxInsertsAtOnce();
    const size_t chunk = perInsert > 0 ? static_cast<size_t>(perInsert) : 1;
    const std::wstring head = oxFormat(L"\nINSERT INTO %s VALUES ", tableName);
    for (size_t i = 0; i < count; ++i) {
        if (i % chunk == 0) {
            if (i > 0)
                sql += L';';
            sql += head;
        } else {
            sql += L',';
        }
        sql += L"('";
        for (wchar_t c : textAt(i)) {
            sql.push_back(c);
            if (c == L'\'')
                sql.push_back(L'\'');
        }
        sql += L"')";
    }
    if (count > 0)
        sql += L';';
    return sql;
}

bool OxQelConnectionSQLite::createTemporaryTableFromObjectArray(std::wstring& tableName,
                                                                OxObject2Array& values,
                                                                short propertyIndex,
                                                                OxQel::FieldType type, int) {
    return OXQEL_SQLITE_GUARDED(L"OxQelConnectionSQLite::createTemporaryTableFromObjectArray", [&] {
        return execute(temporaryTableStatement(tableName, type, values.getCount(), [&](size_t i) {
            const OxObject2* o = values.getAt(i);
            return o ? o->getStringValue(propertyIndex) : std::wstring();
        }));
    });
}

bool OxQelConnectionSQLite::createTemporaryTableFromStringArray(
    std::wstring& tableName, OxArraySimple<StringCompare>& values, OxQel::FieldType type, int) {
    return OXQEL_SQLITE_GUARDED(L"OxQelConnectionSQLite::createTemporaryTableFromStringArray", [&] {
        return execute(temporaryTableStatement(
            tableName, type, values.getCount(),
            [&](size_t i) -> const std::wstring& { return values.getAt(i); }));
    });
}

bool OxQelConnectionSQLite::deleteTemporaryTable(const std::wstring& tableName) {
    return formatAndExecute(oxFormat(L"DROP TABLE IF EXISTS %s", temporaryName(tableName)));
}

bool OxQelConnectionSQLite::executeIn(const wchar_t* head, OxObject2Array& values,
                                      short propertyIndex, OxQel::FieldType type, int) {
    return OXQEL_SQLITE_GUARDED(L"OxQelConnectionSQLite::executeIn", [&] {
        std::wstring sql = temporaryTableStatement(L"ids", type, values.getCount(), [&](size_t i) {
            const OxObject2* o = values.getAt(i);
            return o ? o->getStringValue(propertyIndex) : std::wstring();
        });
        sql += L'\n';
        sql += formatBeforeExecute(head ? head : L"");
        sql += L" IN (SELECT val FROM ids);\n DROP TABLE temp.ids;";
        if (execute(sql))
            return true;
        // A statement that failed part-way leaves no table behind.
        execute(L"DROP TABLE IF EXISTS temp.ids");
        return false;
    });
}
