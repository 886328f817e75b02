#pragma once

#include <cstdint>
#include <string>

#include "platform/core/OxComError.h"
#include "platform/core/OxExport.h"
#include "platform/core/OxVariant.h"

// The published enumeration values of the data-access object model, so that callers
// written against it keep their numbers.
namespace OxAdo {
enum CursorType : int32_t {
    adOpenUnspecified = -1,
    adOpenForwardOnly = 0,
    adOpenKeyset = 1,
    adOpenDynamic = 2,
    adOpenStatic = 3,
};

enum LockType : int32_t {
    adLockUnspecified = -1,
    adLockReadOnly = 1,
    adLockPessimistic = 2,
    adLockOptimistic = 3,
    adLockBatchOptimistic = 4,
};

enum CursorLocation : int32_t {
    adUseNone = 1,
    adUseServer = 2,
    adUseClient = 3,
};

enum ObjectState : int32_t {
    adStateClosed = 0,
    adStateOpen = 1,
    adStateConnecting = 2,
    adStateExecuting = 4,
    adStateFetching = 8,
};

enum DataType : int32_t {
    adEmpty = 0,
    adSmallInt = 2,
    adInteger = 3,
    adSingle = 4,
    adDouble = 5,
    adCurrency = 6,
    adDate = 7,
    adBSTR = 8,
    adIDispatch = 9,
    adError = 10,
    adBoolean = 11,
    adVariant = 12,
    adIUnknown = 13,
    adDecimal = 14,
    adTinyInt = 16,
    adUnsignedTinyInt = 17,
    adUnsignedSmallInt = 18,
    adUnsignedInt = 19,
    adBigInt = 20,
    adUnsignedBigInt = 21,
    adFileTime = 64,
    adGUID = 72,
    adBinary = 128,
    adChar = 129,
    adWChar = 130,
    adNumeric = 131,
    adUserDefined = 132,
    adDBDate = 133,
    adDBTime = 134,
    adDBTimeStamp = 135,
    adChapter = 136,
    adVarNumeric = 139,
    adVarChar = 200,
    adLongVarChar = 201,
    adVarWChar = 202,
    adLongVarWChar = 203,
    adVarBinary = 204,
    adLongVarBinary = 205,
};

enum FieldAttribute : int32_t {
    adFldUnspecified = -1,
    adFldMayDefer = 0x2,
    adFldUpdatable = 0x4,
    adFldUnknownUpdatable = 0x8,
    adFldFixed = 0x10,
    adFldIsNullable = 0x20,
    adFldMayBeNull = 0x40,
    adFldLong = 0x80,
    adFldRowID = 0x100,
    adFldRowVersion = 0x200,
    adFldCacheDeferred = 0x1000,
    adFldKeyColumn = 0x8000,
};

enum ColumnAttribute : int32_t {
    adColFixed = 1,
    adColNullable = 2,
};

enum CommandType : int32_t {
    adCmdUnspecified = -1,
    adCmdText = 1,
    adCmdTable = 2,
    adCmdStoredProc = 4,
    adCmdUnknown = 8,
    adCmdFile = 256,
    adCmdTableDirect = 512,
};

enum ExecuteOption : int32_t {
    adOptionUnspecified = -1,
    adAsyncExecute = 0x10,
    adAsyncFetch = 0x20,
    adExecuteNoRecords = 0x80,
};

enum ConnectOption : int32_t {
    adConnectUnspecified = -1,
    adAsyncConnect = 0x10,
};

enum ParameterDirection : int32_t {
    adParamUnknown = 0,
    adParamInput = 1,
    adParamOutput = 2,
    adParamInputOutput = 3,
    adParamReturnValue = 4,
};

enum Affect : int32_t {
    adAffectCurrent = 1,
    adAffectGroup = 2,
    adAffectAll = 3,
    adAffectAllChapters = 4,
};

enum SearchDirection : int32_t {
    adSearchBackward = -1,
    adSearchForward = 1,
};

enum FilterGroup : int32_t {
    adFilterNone = 0,
    adFilterPendingRecords = 1,
    adFilterAffectedRecords = 2,
    adFilterFetchedRecords = 3,
    adFilterConflictingRecords = 5,
};

enum EditMode : int32_t {
    adEditNone = 0,
    adEditInProgress = 1,
    adEditAdd = 2,
    adEditDelete = 4,
};

enum RecordStatus : int32_t {
    adRecOK = 0,
    adRecNew = 0x1,
    adRecModified = 0x2,
    adRecDeleted = 0x4,
    adRecUnmodified = 0x8,
    adRecConcurrencyViolation = 0x800,
    adRecIntegrityViolation = 0x1000,
    adRecDBDeleted = 0x40000,
};

enum PositionValue : int32_t {
    adPosUnknown = -1,
    adPosBOF = -2,
    adPosEOF = -3,
};

enum CursorOption : int32_t {
    adHoldRecords = 0x100,
    adMovePrevious = 0x200,
    adAddNew = 0x1000400,
    adDelete = 0x1000800,
    adUpdate = 0x1008000,
    adBookmark = 0x2000,
    adApproxPosition = 0x4000,
    adUpdateBatch = 0x10000,
    adResync = 0x20000,
    adNotify = 0x40000,
    adFind = 0x80000,
    adSeek = 0x400000,
    adIndex = 0x800000,
};

enum Schema : int32_t {
    adSchemaColumns = 4,
    adSchemaIndexes = 12,
    adSchemaProcedures = 16,
    adSchemaTables = 20,
    adSchemaPrimaryKeys = 28,
};

enum IsolationLevel : int32_t {
    adXactUnspecified = -1,
    adXactChaos = 0x10,
    adXactReadUncommitted = 0x100,
    adXactCursorStability = 0x1000,
    adXactRepeatableRead = 0x10000,
    adXactSerializable = 0x100000,
};

// Errors of the object model itself (HRESULT 0x800A0000 | number).
enum ErrorValue : int32_t {
    adErrProviderFailed = 3000,
    adErrInvalidArgument = 3001,
    adErrOpeningFile = 3002,
    adErrNoCurrentRecord = 3021,
    adErrIllegalOperation = 3219,
    adErrCantChangeProvider = 3220,
    adErrInTransaction = 3246,
    adErrFeatureNotAvailable = 3251,
    adErrItemNotFound = 3265,
    adErrObjectInCollection = 3367,
    adErrObjectNotSet = 3420,
    adErrDataConversion = 3421,
    adErrObjectClosed = 3704,
    adErrObjectOpen = 3705,
    adErrProviderNotFound = 3706,
    adErrBoundToCommand = 3707,
    adErrInvalidParamInfo = 3708,
    adErrInvalidConnection = 3709,
    adErrNotReentrant = 3710,
    adErrStillExecuting = 3711,
    adErrOperationCancelled = 3712,
    adErrStillConnecting = 3713,
    adErrInvalidTransaction = 3714,
    adErrUnsafeOperation = 3716,
    adErrIntegrityViolation = 3719,
    adErrPermissionDenied = 3720,
    adErrDataOverflow = 3721,
    adErrSchemaViolation = 3722,
    adErrSignMismatch = 3723,
    adErrCantConvertvalue = 3724,
    adErrCantCreate = 3725,
    adErrColumnNotOnThisRow = 3726,
    adErrResourceLocked = 3730,
    adErrFieldsUpdateFailed = 3749,
    adErrProviderNotSpecified = 3753,
};

// HRESULTs of the providers (OLE DB and transaction codes) that the layer raises itself.
namespace Hr {
constexpr OxHResult DB_E_ERRORSINCOMMAND = static_cast<OxHResult>(0x80040E14);
constexpr OxHResult DB_E_CANTCONVERTVALUE = static_cast<OxHResult>(0x80040E07);
constexpr OxHResult DB_E_PARAMNOTOPTIONAL = static_cast<OxHResult>(0x80040E10);
constexpr OxHResult DB_E_ERRORSOCCURRED = static_cast<OxHResult>(0x80040E21);
constexpr OxHResult DB_E_CANTFETCHBACKWARDS = static_cast<OxHResult>(0x80040E24);
constexpr OxHResult DB_E_INTEGRITYVIOLATION = static_cast<OxHResult>(0x80040E2F);
constexpr OxHResult DB_E_ABORTLIMITREACHED = static_cast<OxHResult>(0x80040E31);
constexpr OxHResult DB_E_CONCURRENCYVIOLATION = static_cast<OxHResult>(0x80040E38);
constexpr OxHResult DB_E_NOTABLE = static_cast<OxHResult>(0x80040E37);
constexpr OxHResult DB_E_DATAOVERFLOW = static_cast<OxHResult>(0x80040E57);
constexpr OxHResult DB_SEC_E_AUTH_FAILED = static_cast<OxHResult>(0x80040E4D);
constexpr OxHResult DB_E_NOTSUPPORTED = static_cast<OxHResult>(0x80040E53);
constexpr OxHResult XACT_E_NOTRANSACTION = static_cast<OxHResult>(0x8004D00E);
constexpr OxHResult XACT_E_XTIONEXISTS = static_cast<OxHResult>(0x8004D013);
}  // namespace Hr

constexpr OxHResult hresultOf(ErrorValue error) {
    return static_cast<OxHResult>(0x800A0000u | static_cast<uint32_t>(error));
}

// Error numbers of the model's own values stand in the Errors collection as the plain
// value (3719); raised, they carry their HRESULT form. Other numbers stay.
constexpr OxHResult asHResult(OxHResult number) {
    return number > 0 && number < 0x10000 ? hresultOf(static_cast<ErrorValue>(number)) : number;
}

// The command type carried in the options of Execute and Open: adCmdText when they name
// none (adOptionUnspecified, or execute options alone).
OX_EXPORT long commandTypeOf(long options);

// The object model's own text of an error value.
OX_EXPORT std::wstring descriptionOf(ErrorValue error);
// Raises the object model's error, with its text or the given one.
[[noreturn]] OX_EXPORT void raise(ErrorValue error, const std::wstring& description = {});
[[noreturn]] OX_EXPORT void raise(OxHResult hr, const std::wstring& description);

// The variant type of a field's value for a data type (VT_BSTR for texts and GUIDs,
// VT_DATE for every date type, byte arrays for binaries).
OX_EXPORT uint16_t variantTypeOf(int dataType);
OX_EXPORT bool isTextType(int dataType);
OX_EXPORT bool isBinaryType(int dataType);
OX_EXPORT bool isLongType(int dataType);
OX_EXPORT bool isFixedLengthType(int dataType);
// A value converted to the variant type of the data type; throws OxComError (a type
// mismatch or an overflow) when it does not convert. NULL and empty stay as they are.
OX_EXPORT OxVariant coerceToType(const OxVariant& value, int dataType);
}  // namespace OxAdo
