#define OXQEL_SOURCE_FILE L"OxQelLib/OxQelRecordsetADO"
#include "OxQelLib/ado/OxQelRecordsetADO.h"

#include "OxQelLib/ado/OxQelConnectionADO.h"
#include "OxQelLib/foundation/OxQelConvert.h"
#include "OxQelLib/foundation/OxQelLog.h"
#include "platform/ado/OxAdoConnection.h"
#include "platform/ado/OxAdoRecordset.h"
#include "platform/core/OxFormat.h"

OX_IMPLEMENT_DYNAMIC(OxQelRecordsetADO, OxQelIEditRecordset)

#define OXQEL_RS_REPORT(function, param) \
    OXQEL_REPORT(OxQelConnectionADO::currentErrorMessage(m_connection), function, param)

long OxQelRecordsetADO::_mlMaxCountedRows = 100000000;

namespace {
// The text of a column reference for a report (never throws).
std::wstring columnText(const OxVariant& column) {
    std::wstring s;
    OxQel::Util::tryVariantToString(column, s);
    return s;
}
}  // namespace

OxQelRecordsetADO::OxQelRecordsetADO() {
    createInstance();
}

OxQelRecordsetADO::~OxQelRecordsetADO() {
    releaseInstance();
}

OxObject::CompareResult OxQelRecordsetADO::compareTo(const OxObject* other, int,
                                                     bool descending) const {
    if (!other || !other->IsKindOf(GetRuntimeClass()))
        return NotComparable;
    return descendingCompareResult(NotComparable, descending);
}

void OxQelRecordsetADO::copyFrom(const OxObject& other) {
    OxQelIEditRecordset::copyFrom(other);
    if (const auto* o = OxQelRecordsetADO::cast(&other)) {
        m_recordset = o->m_recordset;
        m_connection = o->m_connection;
        m_cursorType = o->m_cursorType;
        m_lockType = o->m_lockType;
        m_serverSide = o->m_serverSide;
    }
}

OxObject* OxQelRecordsetADO::clone() const {
    auto* copy = new OxQelRecordsetADO();
    copy->copyFrom(*this);
    return copy;
}

OxAdoRecordset& OxQelRecordsetADO::recordset() const {
    if (!m_recordset)
        throw OxComError(OxHr::E_POINTER);
    return *m_recordset;
}

bool OxQelRecordsetADO::createInstance() {
    try {
        if (m_recordset && m_recordset->state() == OxAdo::adStateOpen)
            m_recordset->close();
        m_recordset.reset();
        m_recordset = OxAdoRecordset::create();
        m_recordset->setCacheSize(100);
        return true;
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::createInstance", L"");
        return false;
    }
}

void OxQelRecordsetADO::releaseInstance() {
    try {
        if (m_recordset && m_recordset->state() == OxAdo::adStateOpen)
            m_recordset->close();
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::releaseInstance", L"");
    }
    m_recordset.reset();
}

void OxQelRecordsetADO::getProviderError(std::wstring& message) {
    message.clear();
    if (auto* ado = OxQelConnectionADO::cast(m_connection))
        ado->getProviderError(message);
}

void OxQelRecordsetADO::getComError(std::wstring& message, const OxComError& error) {
    OxQelConnectionADO::getComError(message, error);
}

// ---------------------------------------------------------------- opening and moving

bool OxQelRecordsetADO::openSQL(OxQelIConnection* connection, const std::wstring& statement) {
    m_connection = connection;
    try {
        auto* ado = OxQelConnectionADO::cast(connection);
        if (!ado)
            throw OxComError(OxHr::E_INVALIDARG,
                             L"The connection is not one of the data-access object model.");
        OxAdoRecordset& rs = recordset();
        rs.setCursorLocation(m_serverSide ? OxAdo::adUseServer : OxAdo::adUseClient);
        rs.open(statement, ado->getConnection(), m_cursorType, m_lockType, OxAdo::adCmdText);
        return true;
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::openSQL", statement);
        close();
        return false;
    }
}

void OxQelRecordsetADO::close() {
    try {
        if (m_recordset && m_recordset->state() == OxAdo::adStateOpen)
            m_recordset->close();
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::close", L"");
    }
    m_connection = nullptr;
}

bool OxQelRecordsetADO::getEOF() {
    try {
        return recordset().eof();
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::getEOF", L"");
        return true;  // reading loops end
    }
}

bool OxQelRecordsetADO::getBOF() {
    try {
        return recordset().bof();
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::getBOF", L"");
        return false;
    }
}

long OxQelRecordsetADO::getRecordCount() {
    bool walked = false;
    long position = OxAdo::adPosUnknown;
    try {
        OxAdoRecordset& rs = recordset();
        const long count = rs.recordCount();
        if (count != -1)
            return count;
        if (rs.bof() && rs.eof())
            return 0;
        position = rs.absolutePosition();
        walked = true;
        long n = 0;
        rs.moveFirst();
        while (!rs.eof()) {
            if (n >= _mlMaxCountedRows)
                throw OxComError(OxHr::E_FAIL,
                                 oxFormat(L"The rows did not end after %ld rows.", n));
            ++n;
            rs.moveNext();
        }
        // Back where the caller stood (the end of the rows is where the walk ends).
        if (position == OxAdo::adPosBOF) {
            rs.moveFirst();
            rs.movePrevious();
        } else if (position != OxAdo::adPosEOF) {
            rs.moveFirst();
            if (position > 1)
                rs.move(position - 1);
        }
        return n;
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::getRecordCount", L"");
        if (walked) {
            try {
                OxAdoRecordset& rs = recordset();
                rs.moveFirst();
                if (position > 1)
                    rs.move(position - 1);
            } catch (...) {
                // The cursor stays where the failure left it.
            }
        }
        return -1;
    }
}

bool OxQelRecordsetADO::move(long rows) {
    try {
        recordset().move(rows);
        return true;
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::move", L"");
        return false;
    }
}

bool OxQelRecordsetADO::moveFirst() {
    try {
        recordset().moveFirst();
        return true;
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::moveFirst", L"");
        return false;
    }
}

bool OxQelRecordsetADO::movePrevious() {
    try {
        recordset().movePrevious();
        return true;
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::movePrevious", L"");
        return false;
    }
}

bool OxQelRecordsetADO::moveNext() {
    try {
        recordset().moveNext();
        return true;
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::moveNext", L"");
        return false;
    }
}

bool OxQelRecordsetADO::moveLast() {
    try {
        recordset().moveLast();
        return true;
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::moveLast", L"");
        return false;
    }
}

// ---------------------------------------------------------------- reading

OxAdoFields* OxQelRecordsetADO::getFields() {
    return m_recordset ? &m_recordset->fields() : nullptr;
}

std::shared_ptr<OxAdoField> OxQelRecordsetADO::getFieldPtr(const std::wstring& name) {
    try {
        return recordset().fields().item(name);
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::getFieldPtr", name);
        return nullptr;
    }
}

bool OxQelRecordsetADO::readValue(long index, OxVariant& value) {
    try {
        value = recordset().fields().item(index)->value();
        return true;
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::getlFieldValue", std::to_wstring(index));
        return false;
    }
}

bool OxQelRecordsetADO::readValue(const std::wstring& name, OxVariant& value) {
    try {
        value = recordset().fields().item(name)->value();
        return true;
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::getszFieldValue", name);
        return false;
    }
}

namespace {
// A Boolean reads as itself; anything else counts as true only when it converts to the
// Boolean true. NULL reads false.
bool toBool(const OxVariant& v, bool& out) {
    out = false;
    if (v.vt() == VT_BOOL) {
        out = v.boolVal() != 0;
        return true;
    }
    if (v.isNull() || v.isEmpty())
        return true;
    OxVariant b;
    if (OxHr::failed(v.tryChangeType(VT_BOOL, b)))
        return false;
    out = b.boolVal() == VARIANT_TRUE;
    return true;
}
}  // namespace

bool OxQelRecordsetADO::getField(long index, std::wstring& value) {
    OxVariant v;
    return readValue(index, v) && OxQel::Util::tryVariantToString(v, value);
}
bool OxQelRecordsetADO::getField(long index, double& value) {
    OxVariant v;
    return readValue(index, v) && OxQel::Util::tryVariantToDouble(v, value);
}
bool OxQelRecordsetADO::getField(long index, long& value) {
    OxVariant v;
    return readValue(index, v) && OxQel::Util::tryVariantToLong(v, value);
}
bool OxQelRecordsetADO::getField(long index, bool& value) {
    OxVariant v;
    return readValue(index, v) && toBool(v, value);
}
bool OxQelRecordsetADO::getField(const std::wstring& name, std::wstring& value) {
    OxVariant v;
    return readValue(name, v) && OxQel::Util::tryVariantToString(v, value);
}
bool OxQelRecordsetADO::getField(const std::wstring& name, double& value) {
    OxVariant v;
    return readValue(name, v) && OxQel::Util::tryVariantToDouble(v, value);
}
bool OxQelRecordsetADO::getField(const std::wstring& name, long& value) {
    OxVariant v;
    return readValue(name, v) && OxQel::Util::tryVariantToLong(v, value);
}
bool OxQelRecordsetADO::getField(const std::wstring& name, bool& value) {
    OxVariant v;
    return readValue(name, v) && toBool(v, value);
}

OxVariant OxQelRecordsetADO::getlFieldValue(long index) {
    OxVariant v;
    readValue(index, v);
    return v;
}

OxVariant OxQelRecordsetADO::getszFieldValue(const std::wstring& name) {
    OxVariant v;
    readValue(name, v);
    return v;
}

OxVariant OxQelRecordsetADO::getvarFieldValue(const OxVariant& column) {
    try {
        return recordset().fields().item(column)->value();
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::getvarFieldValue", columnText(column));
        return {};
    }
}

std::wstring OxQelRecordsetADO::getlFieldString(long index) {
    std::wstring s;
    OxQel::Util::tryVariantToString(getlFieldValue(index), s);
    return s;
}

std::wstring OxQelRecordsetADO::getszFieldString(const std::wstring& name) {
    std::wstring s;
    OxQel::Util::tryVariantToString(getszFieldValue(name), s);
    return s;
}

std::wstring OxQelRecordsetADO::getvarFieldString(const OxVariant& column) {
    std::wstring s;
    OxQel::Util::tryVariantToString(getvarFieldValue(column), s);
    return s;
}

long OxQelRecordsetADO::getFieldCount() {
    try {
        return recordset().fields().count();
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::getFieldCount", L"");
        return 0;
    }
}

std::wstring OxQelRecordsetADO::getFieldName(long index) {
    try {
        return recordset().fields().item(index)->name();
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::getFieldName", std::to_wstring(index));
        return {};
    }
}

OxQel::FieldType OxQelRecordsetADO::getFieldType(const OxAdoField& field) {
    return static_cast<OxQel::FieldType>(OxQel::ADODBTypeToQelFieldType(field.type()));
}

OxQel::FieldType OxQelRecordsetADO::getFieldType(long index) {
    try {
        return getFieldType(*recordset().fields().item(index));
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::getFieldType", std::to_wstring(index));
        return OxQel::Unknown;
    }
}

OxQel::FieldType OxQelRecordsetADO::getFieldType(const std::wstring& name) {
    try {
        return getFieldType(*recordset().fields().item(name));
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::getFieldType", name);
        return OxQel::Unknown;
    }
}

OxQel::FieldType OxQelRecordsetADO::getFieldType(const OxVariant& column) {
    try {
        return getFieldType(*recordset().fields().item(column));
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::getFieldType", columnText(column));
        return OxQel::Unknown;
    }
}

int OxQelRecordsetADO::getFieldSize(long index) {
    try {
        return static_cast<int>(recordset().fields().item(index)->definedSize());
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::getFieldSize", std::to_wstring(index));
        return 0;
    }
}

int OxQelRecordsetADO::getFieldSize(const std::wstring& name) {
    try {
        return static_cast<int>(recordset().fields().item(name)->definedSize());
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::getFieldSize", name);
        return 0;
    }
}

int OxQelRecordsetADO::getFieldSize(const OxVariant& column) {
    try {
        return static_cast<int>(recordset().fields().item(column)->definedSize());
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::getFieldSize", columnText(column));
        return 0;
    }
}

bool OxQelRecordsetADO::isFieldNull(long index) {
    return getlFieldValue(index).isNull();
}

bool OxQelRecordsetADO::isFieldNull(const std::wstring& name) {
    return getszFieldValue(name).isNull();
}

bool OxQelRecordsetADO::isFieldNull(const OxVariant& column) {
    return getvarFieldValue(column).isNull();
}

// ---------------------------------------------------------------- definitions

std::wstring OxQelRecordsetADO::stripDefaultText(const std::wstring& s) {
    if (s.size() < 2 || s.front() != L'(' || s.back() != L')')
        return s;
    // Too short a text for its quotes keeps them: (N') and (') have no literal inside.
    if (s.size() >= 5 && s.compare(1, 2, L"N'") == 0)
        return s.substr(3, s.size() - 5);
    if (s.size() >= 4 && s[1] == L'\'')
        return s.substr(2, s.size() - 4);
    return s.substr(1, s.size() - 2);
}

bool OxQelRecordsetADO::initQelFieldFrom(OxQelFieldDef& definition, OxAdoField& field) {
    try {
        definition.setFieldName(field.name());
        if (definition.getIsPropertyToGet(OxQelFieldDef::Type))
            definition.setFieldType(getFieldType(field));
        if (definition.getIsPropertyToGet(OxQelFieldDef::Size))
            definition.setFieldSize(static_cast<int>(field.definedSize()));
        if (definition.getIsPropertyToGet(OxQelFieldDef::CanBeNull)) {
            const long attributes = field.attributes();
            definition.setCanBeNull((attributes & OxAdo::adFldMayBeNull) != 0);
            // The ADO readers keep the row-identity attribute in the no-auto flag, which
            // modifyTable reads back as auto-increment.
            definition.setNoAuto((attributes & OxAdo::adFldRowID) != 0);
        }
        if (definition.getIsPropertyToGet(OxQelFieldDef::DefaultValue)) {
            std::wstring base;
            OxQel::Util::tryVariantToString(field.properties().item(L"BASETABLENAME")->value(),
                                            base);
            std::wstring text;
            if (auto* ado = OxQelConnectionADO::cast(m_connection))
                text = ado->getStrDefaultValue(base, field.name());
            definition.setDefaultValue(stripDefaultText(text));
        }
        return true;
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::initQelFieldFrom", field.name());
        return false;
    }
}

bool OxQelRecordsetADO::getFieldDef(const OxVariant& column, OxQelFieldDef& definition) {
    try {
        return initQelFieldFrom(definition, *recordset().fields().item(column));
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::getFieldDef", columnText(column));
        return false;
    }
}

bool OxQelRecordsetADO::getFieldDef(const std::wstring& name, OxQelFieldDef& definition) {
    try {
        return initQelFieldFrom(definition, *recordset().fields().item(name));
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::getFieldDef", name);
        return false;
    }
}

bool OxQelRecordsetADO::getFieldDef(long index, OxQelFieldDef& definition) {
    try {
        return initQelFieldFrom(definition, *recordset().fields().item(index));
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::getFieldDef", std::to_wstring(index));
        return false;
    }
}

bool OxQelRecordsetADO::getFieldDef(OxQelFieldDefArray& definitions) {
    try {
        definitions.clear();
        OxAdoFields& fields = recordset().fields();
        definitions.resize(static_cast<size_t>(fields.count()));
        bool ok = true;
        for (long i = 0; i < fields.count(); ++i) {
            OxQelFieldDef& d = definitions[static_cast<size_t>(i)];
            d.setIsPropertiesToGetPtr(definitions.getIsPropertiesToGetPtr());
            ok = initQelFieldFrom(d, *fields.item(i)) && ok;
        }
        return ok;
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::getFieldDef", L"");
        return false;
    }
}

// ---------------------------------------------------------------- searching

int OxQelRecordsetADO::find(const std::wstring& criteria) {
    try {
        OxAdoRecordset& rs = recordset();
        if (rs.eof())
            return 0;
        rs.find(criteria, 0, OxAdo::adSearchForward);
        return rs.eof() ? 0 : 1;
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::find", criteria);
        return 0;
    }
}

int OxQelRecordsetADO::findFirst(const std::wstring& criteria) {
    try {
        recordset().moveFirst();
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::findFirst", criteria);
        return 0;
    }
    return find(criteria);
}

int OxQelRecordsetADO::findNext(const std::wstring& criteria) {
    try {
        OxAdoRecordset& rs = recordset();
        if (rs.eof())
            return 0;
        rs.moveNext();
        if (rs.eof())
            return 0;
        rs.find(criteria, 0, OxAdo::adSearchForward);
        return rs.eof() ? 0 : 1;
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::findNext", criteria);
        return 0;
    }
}

bool OxQelRecordsetADO::setFilter(const OxVariant& filter) {
    try {
        recordset().setFilter(filter);
        return true;
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::setFilter", columnText(filter));
        return false;
    }
}

int OxQelRecordsetADO::setFilter(const std::wstring& filter) {
    return setFilter(OxVariant(filter)) ? 1 : 0;
}

bool OxQelRecordsetADO::setSort(const std::wstring& sort) {
    try {
        recordset().setSort(sort);
        return true;
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::setSort", sort);
        return false;
    }
}

bool OxQelRecordsetADO::setOptimize(const OxVariant& column, bool optimize) {
    try {
        const auto property = recordset().fields().item(column)->properties().item(L"Optimize");
        bool current = false;
        if (!toBool(property->value(), current) || !current)
            property->setValue(OxVariant(optimize));
        return true;
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::setOptimize", columnText(column));
        return false;
    }
}

// ---------------------------------------------------------------- writing

bool OxQelRecordsetADO::setlFieldValue(long index, const OxVariant& value) {
    try {
        recordset().fields().item(index)->setValue(value);
        return true;
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::setlFieldValue", std::to_wstring(index));
        return false;
    }
}

bool OxQelRecordsetADO::setszFieldValue(const std::wstring& name, const OxVariant& value) {
    try {
        recordset().fields().item(name)->setValue(value);
        return true;
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::setszFieldValue", name);
        return false;
    }
}

bool OxQelRecordsetADO::setvarFieldValue(const OxVariant& column, const OxVariant& value) {
    try {
        recordset().fields().item(column)->setValue(value);
        return true;
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::setvarFieldValue", columnText(column));
        return false;
    }
}

// A long keeps its 64 bits: the variant is 32-bit only when the value fits.
bool OxQelRecordsetADO::setField(long index, const OxVariant& value) {
    return setlFieldValue(index, value);
}
bool OxQelRecordsetADO::setField(long index, const std::wstring& value) {
    return setlFieldValue(index, OxVariant(value));
}
bool OxQelRecordsetADO::setField(long index, double value) {
    return setlFieldValue(index, OxVariant(value));
}
bool OxQelRecordsetADO::setField(long index, long value) {
    return setlFieldValue(index, OxVariant::fromInteger(value));
}
bool OxQelRecordsetADO::setField(long index, int value) {
    return setlFieldValue(index, OxVariant(static_cast<int32_t>(value)));
}
bool OxQelRecordsetADO::setField(const std::wstring& name, const OxVariant& value) {
    return setszFieldValue(name, value);
}
bool OxQelRecordsetADO::setField(const std::wstring& name, const std::wstring& value) {
    return setszFieldValue(name, OxVariant(value));
}
bool OxQelRecordsetADO::setField(const std::wstring& name, double value) {
    return setszFieldValue(name, OxVariant(value));
}
bool OxQelRecordsetADO::setField(const std::wstring& name, long value) {
    return setszFieldValue(name, OxVariant::fromInteger(value));
}
bool OxQelRecordsetADO::setField(const std::wstring& name, int value) {
    return setszFieldValue(name, OxVariant(static_cast<int32_t>(value)));
}

bool OxQelRecordsetADO::addNew() {
    try {
        recordset().addNew();
        return true;
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::addNew", L"");
        return false;
    }
}

bool OxQelRecordsetADO::remove() {
    try {
        recordset().remove(OxAdo::adAffectCurrent);
        return true;
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::remove", L"");
        return false;
    }
}

bool OxQelRecordsetADO::update() {
    try {
        recordset().update();
        return true;
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::update", L"");
        return false;
    }
}

bool OxQelRecordsetADO::cancelUpdate() {
    try {
        recordset().cancelUpdate();
        return true;
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::cancelUpdate", L"");
        return false;
    }
}

bool OxQelRecordsetADO::updateBatch() {
    try {
        recordset().updateBatch(OxAdo::adAffectAll);
        return true;
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::updateBatch", L"");
        return false;
    }
}

bool OxQelRecordsetADO::cancelBatch() {
    try {
        recordset().cancelBatch(OxAdo::adAffectAll);
        return true;
    } catch (...) {
        OXQEL_RS_REPORT(L"OxQelRecordsetADO::cancelBatch", L"");
        return false;
    }
}
