#pragma once

#include <memory>
#include <string>

#include "platform/ado/OxAdoCollection.h"
#include "platform/ado/OxAdoDefs.h"
#include "platform/core/OxExport.h"
#include "platform/core/OxVariant.h"

// A parameter of a command: name, data type, direction, size and value. Placeholders
// are positional: the n-th "?" of the text takes the n-th parameter appended.
class OX_EXPORT OxAdoParameter {
public:
    OxAdoParameter(std::wstring name, int type, int direction, long size, OxVariant value)
        : m_name(std::move(name)),
          m_type(type),
          m_direction(direction),
          m_size(size),
          m_value(std::move(value)) {}

    const std::wstring& name() const { return m_name; }
    void setName(const std::wstring& name) { m_name = name; }
    int type() const { return m_type; }
    void setType(int type) { m_type = type; }
    int direction() const { return m_direction; }
    void setDirection(int direction) { m_direction = direction; }
    long size() const { return m_size; }
    void setSize(long size) { m_size = size; }
    const OxVariant& value() const { return m_value; }
    void setValue(const OxVariant& value) { m_value = value; }

private:
    std::wstring m_name;
    int m_type;
    int m_direction;
    long m_size;
    OxVariant m_value;
};

class OX_EXPORT OxAdoParameters : public OxAdoCollection<OxAdoParameter> {
public:
    // Appends a parameter; one already in the collection, or a named one whose name is
    // taken, raises adErrObjectInCollection.
    void append(const std::shared_ptr<OxAdoParameter>& parameter);
    void remove(const OxVariant& index);
    void clear() { m_items.clear(); }
};
