#include "OxQelLib/interfaces/OxQelIConnection.h"

OX_IMPLEMENT_DYNAMIC(OxQelIConnection, OxObject)

OxObject* OxQelIConnection::clone() const {
    return nullptr;
}

bool OxQelIConnection::formatAndExecute(const std::wstring& statement) {
    return execute(formatBeforeExecute(statement));
}

bool OxQelIConnection::executeIn(const wchar_t*, OxObject2Array&, short, OxQel::FieldType, int) {
    return false;
}

bool OxQelIConnection::createTemporaryTableFromObjectArray(std::wstring&, OxObject2Array&, short,
                                                           OxQel::FieldType, int) {
    return false;
}

bool OxQelIConnection::createTemporaryTableFromStringArray(std::wstring&,
                                                           OxArraySimple<StringCompare>&,
                                                           OxQel::FieldType, int) {
    return false;
}

bool OxQelIConnection::deleteTemporaryTable(const std::wstring&) {
    return false;
}

long OxQelIConnection::getMaxInsertsAtOnce() {
    return 1;
}
