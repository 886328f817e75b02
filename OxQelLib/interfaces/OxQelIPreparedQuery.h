#pragma once

#include <string>

#include "OxClasses/OxObject.h"
#include "OxQelLib/foundation/OxQelGlobal.h"
#include "platform/core/OxDateTime.h"
#include "platform/core/OxVariant.h"

class OxQelIConnection;

// One parameterised statement run many times. Parameters are written "]]]n[[[" in the
// text and bound by n, counted from 1. No operation throws.
//
// Derived classes bring the inline overloads into scope with
// "using OxQelIPreparedQuery::bindParameter;".
class OX_EXPORT OxQelIPreparedQuery : public OxObject {
    OX_DECLARE_DYNAMIC(OxQelIPreparedQuery)
public:
    ~OxQelIPreparedQuery() override = default;
    OxObject* clone() const override;  // null

    // False when the connection is not of the backend's class.
    virtual bool setConnection(OxQelIConnection* connection) = 0;
    virtual bool prepareQuery(const std::wstring& statement) = 0;
    virtual bool bindParameter(int index, bool value) = 0;
    virtual bool bindParameter(int index, long value) = 0;
    virtual bool bindParameter(int index, double value) = 0;
    virtual bool bindParameter(int index, const OxDateTime& value) = 0;
    virtual bool bindParameter(int index, const std::wstring& value) = 0;
    virtual bool bindParameterVariant(int index, const OxVariant& value, OxQel::FieldType type) = 0;
    // Runs with the bound values; the statement stays prepared for the next binding.
    virtual bool executePreparedQuery() = 0;
    virtual bool deletePreparedQuery() = 0;
    // The statement with its parameter markers replaced by the engine's placeholders.
    virtual std::wstring formatParametersInQuery(const std::wstring& statement) = 0;

    // An int binds as a whole number and a literal as text (never as a boolean).
    bool bindParameter(int index, int value) {
        return bindParameter(index, static_cast<long>(value));
    }
    bool bindParameter(int index, const wchar_t* value) {
        return bindParameter(index, std::wstring(value ? value : L""));
    }
    // 8-bit text would silently bind as the boolean true.
    bool bindParameter(int index, const char* value) = delete;

protected:
    OxQelIPreparedQuery() = default;
};
