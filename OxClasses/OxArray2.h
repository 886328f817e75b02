#pragma once

#include <string>

#include "OxClasses/OxListJoin.h"
#include "OxClasses/OxObArray.h"
#include "OxClasses/OxObject2.h"

// A typed array over an object array: every element is an Element (an OxObject2 or a
// class derived from it), read by property index.
template <class Base, class Element>
class OxArray2 : public Base {
public:
    size_t add(Element* element) { return Base::add(element); }
    Element* getAt(size_t index) const { return static_cast<Element*>(Base::getObjectAt(index)); }

    // The text of one property of every element, in order, joined by the separator, with
    // the chunk separator instead before each element at a multiple of chunkSize.
    virtual std::wstring getListValuesInString(short propertyIndex, std::wstring_view separator,
                                               int chunkSize,
                                               std::wstring_view chunkSeparator) const {
        return oxJoinList(
            Base::getCount(),
            [&](size_t i) {
                const Element* e = getAt(i);
                return e ? e->getStringValue(propertyIndex) : std::wstring();
            },
            separator, chunkSize, chunkSeparator);
    }
};

using OxObject2Array = OxArray2<OxObArray, OxObject2>;
