#include "platform/jet/OxJetTableDefReader.h"

#include <algorithm>
#include <unordered_set>

#include "platform/core/OxFormat.h"
#include "platform/jet/OxJetBytes.h"
#include "platform/jet/OxJetPageFile.h"
#include "platform/jet/OxJetPropertyBlob.h"
#include "platform/jet/OxJetText.h"

namespace {
// Where the fields sit in the two layouts of a definition (offsets in bytes).
struct Layout {
    // The header.
    size_t rowCount, autoNumber, varCols, numCols, numIndexes, numRealIndexes, ownedPages,
        headerEnd;
    size_t realIndexCount;  // per-index entry between the header and the columns
    // One column entry.
    size_t columnEntry, colNumber, colVarIndex, colPrecision, colScale, colFlags, colExtFlags,
        colFixedOffset, colLength;
    // One index data entry: unknown bytes before its ten key columns, and around its flags
    // (after the page map and the first page).
    size_t realIndexSkip, realIndexBeforeFlags, realIndexAfterFlags;
    // One logical index entry: its size, the bytes before the index number, the type.
    size_t logicalIndexEntry, logicalSkip, logicalType;
};

constexpr Layout kJet3 = {.rowCount = 12,
                          .autoNumber = 16,
                          .varCols = 23,
                          .numCols = 25,
                          .numIndexes = 27,
                          .numRealIndexes = 31,
                          .ownedPages = 35,
                          .headerEnd = 43,
                          .realIndexCount = 8,
                          .columnEntry = 18,
                          .colNumber = 1,
                          .colVarIndex = 3,
                          .colPrecision = 11,
                          .colScale = 12,
                          .colFlags = 13,
                          .colExtFlags = 0,
                          .colFixedOffset = 14,
                          .colLength = 16,
                          .realIndexSkip = 0,
                          .realIndexBeforeFlags = 0,
                          .realIndexAfterFlags = 0,
                          .logicalIndexEntry = 20,
                          .logicalSkip = 0,
                          .logicalType = 19};
constexpr Layout kJet4 = {.rowCount = 16,
                          .autoNumber = 20,
                          .varCols = 43,
                          .numCols = 45,
                          .numIndexes = 47,
                          .numRealIndexes = 51,
                          .ownedPages = 55,
                          .headerEnd = 63,
                          .realIndexCount = 12,
                          .columnEntry = 25,
                          .colNumber = 5,
                          .colVarIndex = 7,
                          .colPrecision = 11,
                          .colScale = 12,
                          .colFlags = 15,
                          .colExtFlags = 16,
                          .colFixedOffset = 21,
                          .colLength = 23,
                          .realIndexSkip = 4,
                          .realIndexBeforeFlags = 4,
                          .realIndexAfterFlags = 5,
                          .logicalIndexEntry = 28,
                          .logicalSkip = 4,
                          .logicalType = 23};

constexpr uint8_t kFlagFixed = 0x01;
constexpr uint8_t kFlagAutoLong = 0x04;
constexpr uint8_t kFlagAutoGuid = 0x40;
constexpr uint8_t kFlagHyperlink = 0x80;
constexpr uint8_t kExtCompressed = 0x01;
constexpr uint8_t kExtCalculated = 0xC0;
constexpr uint16_t kUnusedColumn = 0xFFFF;

// The definition's bytes: the first page whole, then each continuation page without its
// 8-byte header.
std::vector<uint8_t> readChain(const OxJetPageFile& file, uint32_t first) {
    const uint32_t size = file.pageSize();
    std::vector<uint8_t> page(size);
    std::vector<uint8_t> all;
    std::unordered_set<uint32_t> seen;
    for (uint32_t pg = first; pg != 0;) {
        if (!seen.insert(pg).second)
            throw OxJetError(oxFormat(L"damaged file: table definition pages loop at page %u", pg));
        file.read(pg, page.data());
        if (page[0] != 0x02 || page[1] != 0x01)
            throw OxJetError(oxFormat(L"damaged file: page %u is no table definition", pg));
        if (all.empty())
            all.insert(all.end(), page.begin(), page.end());
        else
            all.insert(all.end(), page.begin() + 8, page.end());
        pg = OxJetBytes::u32(page.data() + 4);
    }
    return all;
}

// The type's stored width when it is fixed, 0 for variable types.
uint16_t fixedWidth(uint8_t type) {
    switch (static_cast<OxJetType>(type)) {
        case OxJetType::Boolean:
            return 0;
        case OxJetType::Byte:
            return 1;
        case OxJetType::Integer:
            return 2;
        case OxJetType::Long:
        case OxJetType::Single:
        case OxJetType::Complex:
            return 4;
        case OxJetType::Currency:
        case OxJetType::Double:
        case OxJetType::DateTime:
        case OxJetType::BigInt:
            return 8;
        case OxJetType::ReplicationId:
            return 16;
        case OxJetType::Numeric:
            return 17;
        default:
            return 0;
    }
}

void classify(OxJetColumn& c, uint8_t extFlags, bool jet3) {
    switch (static_cast<OxJetType>(c.type)) {
        case OxJetType::Boolean:
        case OxJetType::Byte:
        case OxJetType::Integer:
        case OxJetType::Long:
        case OxJetType::Currency:
        case OxJetType::Single:
        case OxJetType::Double:
        case OxJetType::DateTime:
        case OxJetType::Binary:
        case OxJetType::Text:
        case OxJetType::OleObject:
        case OxJetType::Memo:
        case OxJetType::ReplicationId:
        case OxJetType::Numeric:
        case OxJetType::BigInt:
            break;
        case OxJetType::Complex:
            c.supported = false;
            c.unsupportedReason = L"attachment, multi-value or version history field";
            break;
        case OxJetType::DateTimeExtended:
            c.supported = false;
            c.unsupportedReason = L"extended date/time";
            break;
        default:
            c.supported = false;
            c.unsupportedReason = oxFormat(L"unknown column type 0x%02X", c.type);
            break;
    }
    if (!jet3 && (extFlags & kExtCalculated) == kExtCalculated) {
        c.calculated = true;
        c.supported = false;
        c.unsupportedReason = L"calculated field";
    }
    // A fixed-width type stored with another width cannot be decoded safely.
    const uint16_t width = fixedWidth(c.type);
    if (c.supported && c.fixed && width != 0 && c.length < width) {
        c.supported = false;
        c.unsupportedReason = oxFormat(L"%s stored in %u bytes", oxJetTypeName(c.type), c.length);
    }
}
}  // namespace

OxJetTableDef OxJetTableDefReader::read(const OxJetPageFile& file, uint32_t page,
                                        const std::wstring& name, uint16_t codePage) {
    const bool jet3 = file.header().isJet3();
    const Layout& L = jet3 ? kJet3 : kJet4;
    const std::vector<uint8_t> bytes = readChain(file, page);
    const OxJetBytes::View v(bytes.data(), bytes.size());

    OxJetTableDef def;
    def.name = name;
    def.page = page;
    def.rowCount = v.u32(L.rowCount, L"the row count");
    def.nextAutoNumber = v.u32(L.autoNumber, L"the counter");
    const uint16_t numCols = v.u16(L.numCols, L"the column count");
    def.variableColumns = v.u16(L.varCols, L"the column count");
    const uint32_t numIndexes = v.u32(L.numIndexes, L"the index count");
    const uint32_t numReal = v.u32(L.numRealIndexes, L"the index count");
    def.ownedPagesMap = v.u32(L.ownedPages, L"the page map");
    // Each entry needs bytes of its own, so counts larger than the definition are damage.
    if (numIndexes > bytes.size() / L.logicalIndexEntry || numReal > bytes.size() / 39 ||
        numCols > bytes.size() / L.columnEntry)
        throw OxJetError(oxFormat(L"damaged file: table %s claims %u columns and %u indexes", name,
                                  numCols, numIndexes));

    size_t pos = L.headerEnd + numReal * L.realIndexCount;
    def.columns.resize(numCols);
    for (OxJetColumn& c : def.columns) {
        const uint8_t* e = v.at(pos, L.columnEntry, L"a column entry");
        c.type = e[0];
        c.number = OxJetBytes::u16(e + L.colNumber);
        c.varIndex = OxJetBytes::u16(e + L.colVarIndex);
        c.fixedOffset = OxJetBytes::u16(e + L.colFixedOffset);
        c.length = OxJetBytes::u16(e + L.colLength);
        const uint8_t flags = e[L.colFlags];
        const uint8_t ext = jet3 ? 0 : e[L.colExtFlags];
        c.fixed = (flags & kFlagFixed) != 0;
        c.autoNumber = (flags & kFlagAutoLong) != 0 && c.type == uint8_t(OxJetType::Long);
        c.autoGuid = (flags & kFlagAutoGuid) != 0 && c.type == uint8_t(OxJetType::ReplicationId);
        c.hyperlink = !jet3 && (flags & kFlagHyperlink) != 0 && c.type == uint8_t(OxJetType::Memo);
        c.compressedUnicode = (ext & kExtCompressed) != 0;
        if (c.type == uint8_t(OxJetType::Numeric)) {
            c.precision = e[L.colPrecision];
            c.scale = e[L.colScale];
        }
        c.required = c.type == uint8_t(OxJetType::Boolean);  // a yes/no field is never NULL
        c.size = c.type == uint8_t(OxJetType::Text) && !jet3 ? c.length / 2u : c.length;
        classify(c, ext, jet3);
        pos += L.columnEntry;
    }
    OxJetText text(jet3 ? codePage : 0);
    auto readName = [&](std::wstring& out) {
        if (jet3) {
            const uint8_t len = v.u8(pos, L"a name");
            text.decode(v.at(pos + 1, len, L"a name"), len, out);
            pos += 1 + len;
        } else {
            const uint16_t len = v.u16(pos, L"a name");
            OxJetText::decodeUtf16(v.at(pos + 2, len, L"a name"), len, out);
            pos += 2 + len;
        }
    };
    for (OxJetColumn& c : def.columns) readName(c.name);

    struct Real {
        std::vector<OxJetIndexColumn> columns;
        uint8_t flags = 0;
    };
    std::vector<Real> reals(numReal);
    for (Real& r : reals) {
        pos += L.realIndexSkip;
        for (int k = 0; k < 10; ++k) {
            const uint16_t colNum = v.u16(pos, L"an index entry");
            const uint8_t order = v.u8(pos + 2, L"an index entry");
            pos += 3;
            if (colNum == kUnusedColumn)
                continue;
            const auto it = std::find_if(def.columns.begin(), def.columns.end(),
                                         [&](const OxJetColumn& c) { return c.number == colNum; });
            if (it == def.columns.end())
                throw OxJetError(
                    oxFormat(L"damaged file: an index of %s names column %u", name, colNum));
            r.columns.push_back({static_cast<size_t>(it - def.columns.begin()), (order & 1) == 0});
        }
        pos += 8 + L.realIndexBeforeFlags;  // page map and first page
        r.flags = v.u8(pos, L"an index entry");
        pos += 1 + L.realIndexAfterFlags;
    }
    def.indexes.resize(numIndexes);
    for (OxJetIndex& ix : def.indexes) {
        const uint8_t* e = v.at(pos, L.logicalIndexEntry, L"an index entry");
        const uint32_t real = OxJetBytes::u32(e + L.logicalSkip + 4);
        const uint8_t type = e[L.logicalType];
        if (real >= reals.size())
            throw OxJetError(
                oxFormat(L"damaged file: an index of %s refers to index data %u", name, real));
        ix.columns = reals[real].columns;
        ix.unique = (reals[real].flags & 0x01) != 0;
        ix.ignoreNulls = (reals[real].flags & 0x02) != 0;
        ix.required = (reals[real].flags & 0x08) != 0;
        ix.primary = type == 1;
        ix.foreignKey = type == 2;
        pos += L.logicalIndexEntry;
    }
    for (OxJetIndex& ix : def.indexes) readName(ix.name);
    return def;
}

void OxJetTableDefReader::applyProperties(OxJetTableDef& def, const std::vector<uint8_t>& blob,
                                          bool jet3, uint16_t codePage) {
    for (auto& block : OxJetPropertyBlob::parse(blob, jet3, codePage)) {
        if (!block.isColumn) {
            def.properties = std::move(block.values);
            continue;
        }
        const int at = def.columnIndex(block.objectName);
        if (at < 0)
            continue;  // properties of a deleted column
        OxJetColumn& c = def.columns[static_cast<size_t>(at)];
        for (const auto& [key, value] : block.values) {
            if (OxText::equalsNoCase(key, L"Required"))
                c.required = c.required || value == L"True";
            else if (OxText::equalsNoCase(key, L"AllowZeroLength"))
                c.allowZeroLength = value == L"True";
            else if (OxText::equalsNoCase(key, L"DefaultValue"))
                c.defaultValue = value;
        }
        c.properties = std::move(block.values);
    }
}
