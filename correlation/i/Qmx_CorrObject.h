// Qmx_CorrObject: the common base of every object a host sees (containers, items, explicit
// and implicit relationships). It holds no data; its virtual operations fix how an object's
// shared data, name and debug output are reached, and its non-virtual property operations act
// on the property map in that data. Objects are made and destroyed by their database only,
// never deleted by a host, hence the protected destructor.
//
// Properties: a name is restricted when the process's Qmx_CorrPropertyRegistry lists it; every
// access to a restricted name must pass its accessor code, every access to another name a null
// accessor, or Qmx_CorrException::IncorrectPropertyAccessor (property name) is thrown.
#ifndef QMX_CORROBJECT_H
#define QMX_CORROBJECT_H
#include <iosfwd>

#include "QmxCorrExport.h"
#include "Qmx_CorrPropertyValue.h"
#include "Vesk_StringBase.h"

class Qmx_CorrObjectData;

class QMX_CORR_EXPORT Qmx_CorrObject {
protected:
    // Declared first so that it keeps the first virtual slot.
    virtual ~Qmx_CorrObject();

public:
    Qmx_CorrObject() = default;
    Qmx_CorrObject(const Qmx_CorrObject&) = default;
    Qmx_CorrObject& operator=(const Qmx_CorrObject&) = default;

    // The data for reading; possibly shared with other objects.
    virtual const Qmx_CorrObjectData* GetObjectData() const = 0;
    // The data for writing: when the current record is shared, the object first gets a record
    // of its own whose property map starts empty.
    virtual Qmx_CorrObjectData* GetObjectDataForWrite() = 0;
    virtual Vesk::StringBase<char> GetName() const = 0;
    virtual bool DbgValidateState() const;
    // Three lines at `indent`: "<type>: '<name>'", "{", "}".
    virtual void DbgDump(std::ostream& out, unsigned indent) const;
    // Standard error, indent 0.
    virtual void DbgDump() const;

    // A constant reference into the object's data: valid until the data is replaced.
    const Qmx_CorrPropertyMap& GetProperties() const;
    // No accessor test.
    bool HasProperty(const Vesk::StringBase<char>& name) const;
    // The accessor is tested first; then PropertyDoesNotExist or IncorrectPropertyType, both
    // with the name.
    int GetProperty_INT32(const Vesk::StringBase<char>& name, const char* accessor) const;
    // Valid until the property is next changed or removed, or the object's data is replaced.
    const Vesk::StringBase<char>& GetProperty_String(const Vesk::StringBase<char>& name,
                                                     const char* accessor) const;
    // Creates the property or changes its tag and the field of the new type (the other field
    // stays). The object's data is made its own before the accessor is tested, so a refused
    // write may still leave the object with a private, empty record.
    void SetProperty_INT32(const Vesk::StringBase<char>& name, int value, const char* accessor);
    void SetProperty_String(const Vesk::StringBase<char>& name, const Vesk::StringBase<char>& value,
                            const char* accessor);
    // Removing an absent property does nothing and tests no accessor.
    void DestroyProperty(const Vesk::StringBase<char>& name, const char* accessor);
};

#endif
