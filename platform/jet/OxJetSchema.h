#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

// The records the reader hands out: what the file says about its format, its objects,
// and the columns and indexes of a table. Plain data, copied freely.

enum class OxJetFormat : uint8_t { Jet3, Jet4, Ace12, Ace14, Ace15, Ace16, Ace17 };

// Column types by the code the file stores.
enum class OxJetType : uint8_t {
    Boolean = 0x01,
    Byte = 0x02,
    Integer = 0x03,
    Long = 0x04,
    Currency = 0x05,
    Single = 0x06,
    Double = 0x07,
    DateTime = 0x08,
    Binary = 0x09,
    Text = 0x0A,
    OleObject = 0x0B,
    Memo = 0x0C,
    ReplicationId = 0x0F,
    Numeric = 0x10,
    Complex = 0x12,  // attachments, multi-value fields, memo version history
    BigInt = 0x13,
    DateTimeExtended = 0x14,
};

using OxJetProperties = std::vector<std::pair<std::wstring, std::wstring>>;

struct OxJetColumn {
    std::wstring name;
    uint8_t type = 0;  // an OxJetType code, or an unknown one
    // False for types this reader does not decode (attachments, multi-value and
    // calculated fields, extended dates, unknown codes): their values come back as
    // OxJetValue::Unsupported, and unsupportedReason says why.
    bool supported = true;
    std::wstring unsupportedReason;
    uint32_t size = 0;  // the field size: characters for text, bytes for other types
    uint8_t precision = 0;
    uint8_t scale = 0;
    bool required = false;  // from the Required property; files without properties say nullable
    bool allowZeroLength = true;
    bool autoNumber = false;  // a Long counter
    bool autoGuid = false;    // a replication ID the engine fills in
    bool compressedUnicode = false;
    bool hyperlink = false;
    bool calculated = false;
    std::optional<std::wstring> defaultValue;  // the expression text, as the file keeps it
    OxJetProperties properties;                // every stored property, as text

    // Where the values sit in a row.
    uint16_t number = 0;    // bit of the null mask
    uint16_t varIndex = 0;  // slot in the variable-length table
    uint16_t fixedOffset = 0;
    uint16_t length = 0;  // stored length in bytes
    bool fixed = false;
};

struct OxJetIndexColumn {
    size_t column = 0;  // position in OxJetTableDef::columns
    bool descending = false;
};

struct OxJetIndex {
    std::wstring name;
    std::vector<OxJetIndexColumn> columns;  // in key order
    bool primary = false;
    bool unique = false;
    bool foreignKey = false;  // the engine's own index behind a relationship
    bool ignoreNulls = false;
    bool required = false;
};

struct OxJetTableDef {
    std::wstring name;
    uint32_t page = 0;            // the definition's first page
    uint32_t rowCount = 0;        // the count the definition keeps (may be stale)
    uint32_t nextAutoNumber = 0;  // the next Long counter value
    std::vector<OxJetColumn> columns;
    std::vector<OxJetIndex> indexes;
    OxJetProperties properties;
    uint32_t ownedPagesMap = 0;    // row and page of the map of the table's data pages
    uint16_t variableColumns = 0;  // rows carry a table of variable offsets when non-zero
    std::wstring propertyError;    // why the stored properties could not be read, if so

    // The column of that name (case-insensitive), or nullptr.
    const OxJetColumn* column(std::wstring_view name) const;
    // Its position, or -1.
    int columnIndex(std::wstring_view name) const;
};

// A relationship between two tables, as MSysRelationships keeps it.
struct OxJetRelationship {
    std::wstring name;
    std::wstring table;            // the table whose columns refer to the other
    std::wstring referencedTable;  // the table referred to
    std::vector<std::pair<std::wstring, std::wstring>> columns;  // (column, referenced column)
    uint32_t flags = 0;
    bool enforced = true;  // referential integrity
    bool oneToOne = false;
    bool cascadeUpdates = false;
    bool cascadeDeletes = false;
    bool cascadeNulls = false;  // deleting a referenced row sets the columns to NULL
};

enum class OxJetObjectKind : uint8_t {
    Table,
    SystemTable,
    Query,
    LinkedTable,      // a table in another Access file
    LinkedOdbcTable,  // a table behind an ODBC connect string
};

struct OxJetCatalogEntry {
    std::wstring name;
    OxJetObjectKind kind = OxJetObjectKind::Table;
    int32_t id = 0;
    int32_t parentId = 0;
    int16_t rawType = 0;
    uint32_t flags = 0;
    bool hidden = false;
    uint32_t definitionPage = 0;        // local tables only
    std::wstring linkedDatabase;        // linked tables: the file (or ODBC database) they point to
    std::wstring connect;               // linked tables: the connect string
    std::wstring foreignName;           // linked tables: the table's name in the target
    std::vector<uint8_t> propertyBlob;  // the stored properties, parsed with the definition
    std::wstring propertyError;         // set when the catalog's properties were damaged
};

// Short English names ("Text", "Long Integer", "Currency", ...); "Unknown" for other codes.
const wchar_t* oxJetTypeName(uint8_t type);
const wchar_t* oxJetObjectKindName(OxJetObjectKind kind);
