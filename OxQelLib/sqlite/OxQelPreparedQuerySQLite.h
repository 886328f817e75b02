#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "OxQelLib/interfaces/OxQelIPreparedQuery.h"

struct sqlite3;
struct sqlite3_stmt;
class OxQelConnectionSQLite;

// One statement of the SQLite backend compiled once and run many times, as the copy
// engines insert rows. The marker "]]]n[[[" becomes the SQLite parameter ?n, so n is the
// index the bind operations take.
class OX_EXPORT OxQelPreparedQuerySQLite : public OxQelIPreparedQuery {
    OX_DECLARE_DYNAMIC(OxQelPreparedQuerySQLite)
public:
    using OxQelIPreparedQuery::bindParameter;

    OxQelPreparedQuerySQLite() = default;
    ~OxQelPreparedQuerySQLite() override;
    OxQelPreparedQuerySQLite(const OxQelPreparedQuerySQLite&) = delete;
    OxQelPreparedQuerySQLite& operator=(const OxQelPreparedQuerySQLite&) = delete;

    bool setConnection(OxQelIConnection* connection) override;
    bool prepareQuery(const std::wstring& statement) override;
    bool bindParameter(int index, bool value) override;
    // Whole numbers keep all 64 bits.
    bool bindParameter(int index, long value) override;
    bool bindParameter(int index, double value) override;
    // As the text "%Y%m%d %H:%M:%S " (18 characters); an invalid date as an empty text.
    bool bindParameter(int index, const OxDateTime& value) override;
    bool bindParameter(int index, const std::wstring& value) override;
    // Converts the value for the column type. NULL binds NULL and a byte array a blob
    // whatever the type; a column of no known type (Unknown) takes the value's own type.
    bool bindParameterVariant(int index, const OxVariant& value, OxQel::FieldType type) override;
    bool executePreparedQuery() override;
    bool deletePreparedQuery() override;
    std::wstring formatParametersInQuery(const std::wstring& statement) override;

private:
    bool isValid() const;
    int getNumberOfParamInPreparedStatement() const;
    bool verifyBindIndex(int index) const;
    std::wstring convertDateToString(const OxDateTime& date) const;
    bool bindText(int index, std::wstring_view text);
    bool bindInteger(int index, long value);
    bool bindReal(int index, double value);
    bool bindBytes(int index, const void* data, size_t size);
    bool bindNull(int index);
    bool bindByOwnType(int index, const OxVariant& value);
    template <class T>
    bool checkBind(int rc, const wchar_t* format, int index, const T& value);

    OxQelConnectionSQLite* m_connection = nullptr;
    sqlite3_stmt* m_statement = nullptr;
    int m_notPrepared = 1;
    int m_parameterCount = -1;
    // The engine handle the statement was compiled on: a reopened connection has another.
    sqlite3* m_compiledOn = nullptr;
    bool m_utf16 = false;
    // Bound texts and blobs stay here, one buffer per parameter, until bound again.
    std::vector<std::string> m_bytes;
    std::vector<std::u16string> m_units;
};
