#pragma once

#include "platform/core/OxExport.h"
#include "platform/core/OxRuntimeClass.h"

// The base of every class of the library: run-time class, comparison, copy and clone.
class OX_EXPORT OxObject : public OxRuntimeObject {
    OX_DECLARE_DYNAMIC(OxObject)
public:
    enum CompareResult { NotComparable = -2, Less = -1, Equal = 0, Greater = 1 };

    OxObject() = default;
    OxObject(const OxObject&) = default;
    OxObject& operator=(const OxObject&) = default;
    ~OxObject() override = default;

    // Compares by the given property; NotComparable when the other object is not of
    // this class (and for every class that defines no order).
    virtual CompareResult compareTo(const OxObject* other, int property = 0,
                                    bool descending = false) const;
    // Copies the base state; derived classes call it first.
    virtual void copyFrom(const OxObject& other);
    // A new object of the same class, owned by the caller.
    virtual OxObject* clone() const;

protected:
    static CompareResult descendingCompareResult(CompareResult result, bool descending);
};
