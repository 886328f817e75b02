#include "platform/ado/OxAdoDefs.h"

#include "platform/core/OxFormat.h"

namespace OxAdo {
std::wstring descriptionOf(ErrorValue error) {
    switch (error) {
        case adErrProviderFailed:
            return L"Provider failed to perform the requested operation.";
        case adErrInvalidArgument:
            return L"Arguments are of the wrong type, are out of acceptable range, or are in "
                   L"conflict with one another.";
        case adErrOpeningFile:
            return L"File could not be opened.";
        case adErrNoCurrentRecord:
            return L"Either BOF or EOF is True, or the current record has been deleted. Requested "
                   L"operation requires a current record.";
        case adErrIllegalOperation:
            return L"Operation is not allowed in this context.";
        case adErrCantChangeProvider:
            return L"Supplied provider is different from the one already in use.";
        case adErrInTransaction:
            return L"Connection object cannot be explicitly closed while in a transaction.";
        case adErrFeatureNotAvailable:
            return L"Object or provider is not capable of performing requested operation.";
        case adErrItemNotFound:
            return L"Item cannot be found in the collection corresponding to the requested name or "
                   L"ordinal.";
        case adErrObjectInCollection:
            return L"Object is already in collection. Cannot append.";
        case adErrObjectNotSet:
            return L"Object is no longer valid.";
        case adErrDataConversion:
            return L"Application uses a value of the wrong type for the current operation.";
        case adErrObjectClosed:
            return L"Operation is not allowed when the object is closed.";
        case adErrObjectOpen:
            return L"Operation is not allowed when the object is open.";
        case adErrProviderNotFound:
            return L"Provider cannot be found. It may not be properly installed.";
        case adErrBoundToCommand:
            return L"Cannot change the ActiveConnection property of a Recordset object which has "
                   L"a Command object as its source.";
        case adErrInvalidParamInfo:
            return L"Parameter object is improperly defined. Inconsistent or incomplete "
                   L"information was provided.";
        case adErrInvalidConnection:
            return L"The connection cannot be used to perform this operation. It is either closed "
                   L"or invalid in this context.";
        case adErrNotReentrant:
            return L"Operation cannot be performed while processing event.";
        case adErrStillExecuting:
            return L"Operation cannot be performed while executing asynchronously.";
        case adErrOperationCancelled:
            return L"Operation has been cancelled by the user.";
        case adErrStillConnecting:
            return L"Operation cannot be performed while connecting asynchronously.";
        case adErrInvalidTransaction:
            return L"Coordinating transaction is invalid or has not started.";
        case adErrUnsafeOperation:
            return L"Safety settings on this computer prohibit accessing a data source on another "
                   L"domain.";
        case adErrIntegrityViolation:
            return L"Data value conflicts with the integrity constraints of the field.";
        case adErrPermissionDenied:
            return L"Insufficient permission prevents writing to the field.";
        case adErrDataOverflow:
            return L"Data value is too large to be represented by the field data type.";
        case adErrSchemaViolation:
            return L"Data value conflicts with the data type or constraints of the field.";
        case adErrSignMismatch:
            return L"Conversion failed because the data value was signed and the field data type "
                   L"used by the provider was unsigned.";
        case adErrCantConvertvalue:
            return L"Data value cannot be converted for reasons other than sign mismatch or data "
                   L"overflow.";
        case adErrCantCreate:
            return L"Data value cannot be set or retrieved because the field data type was "
                   L"unknown, or the provider had insufficient resources to perform the operation.";
        case adErrColumnNotOnThisRow:
            return L"Record does not contain this field.";
        case adErrResourceLocked:
            return L"The object represented by the specified URL is locked by one or more other "
                   L"processes.";
        case adErrFieldsUpdateFailed:
            return L"Fields update failed. For further information, examine the Status property of "
                   L"individual field objects.";
        case adErrProviderNotSpecified:
            return L"Provider is not specified in the connection string.";
    }
    return oxFormat(L"Error %d", static_cast<int>(error));
}

long commandTypeOf(long options) {
    if (options == adOptionUnspecified)
        return adCmdText;
    const long type =
        options & (adCmdText | adCmdTable | adCmdStoredProc | adCmdUnknown | adCmdTableDirect);
    return type == 0 || type == adCmdUnknown ? static_cast<long>(adCmdText) : type;
}

void raise(ErrorValue error, const std::wstring& description) {
    throw OxComError(hresultOf(error), description.empty() ? descriptionOf(error) : description);
}

void raise(OxHResult hr, const std::wstring& description) {
    throw OxComError(hr, description);
}

uint16_t variantTypeOf(int dataType) {
    switch (dataType) {
        case adSmallInt:
            return VT_I2;
        case adInteger:
            return VT_I4;
        case adBigInt:
            return VT_I8;
        case adTinyInt:
            return VT_I1;
        case adUnsignedTinyInt:
            return VT_UI1;
        case adUnsignedSmallInt:
            return VT_UI2;
        case adUnsignedInt:
            return VT_UI4;
        case adUnsignedBigInt:
            return VT_UI8;
        case adSingle:
            return VT_R4;
        case adDouble:
            return VT_R8;
        case adCurrency:
            return VT_CY;
        case adDecimal:
        case adNumeric:
        case adVarNumeric:
            return VT_DECIMAL;
        case adBoolean:
            return VT_BOOL;
        case adDate:
        case adDBDate:
        case adDBTime:
        case adDBTimeStamp:
        case adFileTime:
            return VT_DATE;
        case adBSTR:
        case adChar:
        case adVarChar:
        case adLongVarChar:
        case adWChar:
        case adVarWChar:
        case adLongVarWChar:
        case adGUID:
            return VT_BSTR;
        case adBinary:
        case adVarBinary:
        case adLongVarBinary:
            return VT_ARRAY | VT_UI1;
        default:
            return VT_EMPTY;
    }
}

bool isTextType(int dataType) {
    switch (dataType) {
        case adBSTR:
        case adChar:
        case adVarChar:
        case adLongVarChar:
        case adWChar:
        case adVarWChar:
        case adLongVarWChar:
            return true;
        default:
            return false;
    }
}

bool isBinaryType(int dataType) {
    return dataType == adBinary || dataType == adVarBinary || dataType == adLongVarBinary;
}

bool isLongType(int dataType) {
    return dataType == adLongVarChar || dataType == adLongVarWChar || dataType == adLongVarBinary;
}

bool isFixedLengthType(int dataType) {
    return !isTextType(dataType) && !isBinaryType(dataType) && dataType != adVarNumeric;
}

OxVariant coerceToType(const OxVariant& value, int dataType) {
    const uint16_t vt = variantTypeOf(dataType);
    if (vt == VT_EMPTY || value.isNull() || value.isEmpty() || value.vt() == vt)
        return value;
    // Bytes stay bytes: text is never reinterpreted as binary data.
    if (vt == (VT_ARRAY | VT_UI1))
        throw OxComError(OxHr::DISP_E_TYPEMISMATCH);
    return value.changedType(vt);
}
}  // namespace OxAdo
