#pragma once

#include "platform/core/OxExport.h"

// The run-time class record of the platform's object model: a class name and the
// record of its base class. Records are reached through functions, so that their order
// of construction across libraries never matters.
struct OX_EXPORT OxRuntimeClass {
    const char* m_lpszClassName;
    const OxRuntimeClass* (*m_pfnGetBaseClass)();

    const OxRuntimeClass* baseClass() const {
        return m_pfnGetBaseClass ? m_pfnGetBaseClass() : nullptr;
    }
    // True when this class is the given one or derives from it.
    bool IsDerivedFrom(const OxRuntimeClass* base) const;
};

// The root of every run-time-typed object (the platform's base object class).
class OX_EXPORT OxRuntimeObject {
public:
    virtual ~OxRuntimeObject() = default;

    static const OxRuntimeClass* GetThisClass();
    virtual const OxRuntimeClass* GetRuntimeClass() const;
    bool IsKindOf(const OxRuntimeClass* runtimeClass) const;

protected:
    OxRuntimeObject() = default;
    OxRuntimeObject(const OxRuntimeObject&) = default;
    OxRuntimeObject& operator=(const OxRuntimeObject&) = default;
};

// In a class body: the run-time class members every class of the library offers.
#define OX_DECLARE_DYNAMIC(Class)                            \
public:                                                      \
    static const OxRuntimeClass* GetThisClass();             \
    const OxRuntimeClass* GetRuntimeClass() const override;  \
    static Class* cast(OxRuntimeObject* object);             \
    static const Class* cast(const OxRuntimeObject* object); \
    static const char* desc() {                              \
        return #Class;                                       \
    }

// In the class's source file. Base names the record's base, which is normally the C++
// base class.
#define OX_IMPLEMENT_DYNAMIC(Class, Base)                                                      \
    const OxRuntimeClass* Class::GetThisClass() {                                              \
        static const OxRuntimeClass record{#Class, &Base::GetThisClass};                       \
        return &record;                                                                        \
    }                                                                                          \
    const OxRuntimeClass* Class::GetRuntimeClass() const {                                     \
        return Class::GetThisClass();                                                          \
    }                                                                                          \
    Class* Class::cast(OxRuntimeObject* object) {                                              \
        return object && object->IsKindOf(Class::GetThisClass()) ? static_cast<Class*>(object) \
                                                                 : nullptr;                    \
    }                                                                                          \
    const Class* Class::cast(const OxRuntimeObject* object) {                                  \
        return object && object->IsKindOf(Class::GetThisClass())                               \
                   ? static_cast<const Class*>(object)                                         \
                   : nullptr;                                                                  \
    }
