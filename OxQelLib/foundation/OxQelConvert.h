#pragma once

#include <cstdint>
#include <string>

#include "OxQelLib/foundation/OxQelGlobal.h"
#include "platform/core/OxDateTime.h"
#include "platform/core/OxVariant.h"

// Value conversions, ADO type maps and SQL type names shared by every backend.
namespace OxQel {
OX_EXPORT bool isStringType(FieldType type);

OX_EXPORT int QelFieldTypeToADODBType(int qelType);
OX_EXPORT int ADODBTypeToQelFieldType(int adoType);

// Variant conversions. Where they change the variant's type through the platform and
// that fails, they throw OxComError (as their callers on Windows expect); the library's
// own code calls the OxQel::Util forms below, which never throw.
OX_EXPORT void _variantToString(const OxVariant& value, std::wstring& out);
OX_EXPORT std::wstring _variantToString(const OxVariant& value);
OX_EXPORT void _variantToBool(const OxVariant& value, bool& out);
OX_EXPORT void _variantToDate(const OxVariant& value, OxDateTime& out);
OX_EXPORT void _variantToDouble(const OxVariant& value, double& out);
// long is 64 bits here, so 64-bit values survive; values that fit in 32 bits come out
// as they always did.
OX_EXPORT void _variantToLong(const OxVariant& value, long& out);
// True when the conversion failed (out is then 0).
OX_EXPORT bool _variantToULong(const OxVariant& value, uint32_t& out);

// Whether the Access database engine is installed: there is no such engine on Linux.
OX_EXPORT bool _checkACEDriverInstalled();

namespace ADO {
OX_EXPORT std::wstring getStrSQLFieldType(FieldType type, int size);
}
namespace Access {
OX_EXPORT std::wstring getStrSQLFieldType(FieldType type, int size);
OX_EXPORT std::wstring formatStrFieldType(FieldType type, int size,
                                          const std::wstring& defaultValue, bool canBeNull);
}  // namespace Access
namespace SQLServer {
OX_EXPORT std::wstring getStrSQLFieldType(FieldType type, int size);
OX_EXPORT std::wstring formatStrFieldType(const std::wstring& table, const std::wstring& field,
                                          FieldType type, int size,
                                          const std::wstring& defaultValue, bool canBeNull);
OX_EXPORT std::wstring formatStrFieldConstraint(const std::wstring& table,
                                                const std::wstring& field);
}  // namespace SQLServer

namespace Util {
// The conversions above without exceptions: false (and out left at its empty value)
// when the platform refused the conversion.
OX_EXPORT bool tryVariantToString(const OxVariant& value, std::wstring& out) noexcept;
OX_EXPORT bool tryVariantToBool(const OxVariant& value, bool& out) noexcept;
OX_EXPORT bool tryVariantToDate(const OxVariant& value, OxDateTime& out) noexcept;
OX_EXPORT bool tryVariantToDouble(const OxVariant& value, double& out) noexcept;
OX_EXPORT bool tryVariantToLong(const OxVariant& value, long& out) noexcept;
}  // namespace Util
}  // namespace OxQel
