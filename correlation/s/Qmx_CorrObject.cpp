#include "Qmx_CorrObject.h"

#include <iostream>
#include <typeinfo>

#include "Qmx_CorrDbg.h"
#include "Qmx_CorrException.h"
#include "Qmx_CorrObjectData.h"
#include "Qmx_CorrObjectOwner.h"
#include "Qmx_CorrPropertyRegistry.h"

namespace {
const char* const kSourceFile = "s/Qmx_CorrObject";
const char* const kRevision = "1";

// Property changes are changes of the database: a commit must write them.
void MarkModified(Qmx_CorrObjectData* data) {
    if (data->GetOwner()) data->GetOwner()->SetModified();
}

void CheckAccessor(const Vesk::StringBase<char>& name, const char* accessor) {
    if (!Qmx_CorrPropertyRegistry::GetInstance().IsProperAccessor(name, accessor))
        QMX_CORR_THROW(IncorrectPropertyAccessor, name.c_str());
}

}  // namespace

Qmx_CorrObject::~Qmx_CorrObject() = default;

bool Qmx_CorrObject::DbgValidateState() const { return true; }

void Qmx_CorrObject::DbgDump(std::ostream& out, unsigned indent) const {
    Qmx_CorrDbg::PrintEmptyBlock(
        out, indent, Qmx_CorrDbg::GetDumpName(typeid(Qmx_CorrObject)) + ": '" + GetName() + "'");
}

void Qmx_CorrObject::DbgDump() const { DbgDump(std::cerr, 0); }

const Qmx_CorrPropertyMap& Qmx_CorrObject::GetProperties() const {
    return GetObjectData()->GetProperties();
}

bool Qmx_CorrObject::HasProperty(const Vesk::StringBase<char>& name) const {
    return GetProperties().count(name) != 0;
}

int Qmx_CorrObject::GetProperty_INT32(const Vesk::StringBase<char>& name,
                                      const char* accessor) const {
    CheckAccessor(name, accessor);
    auto it = GetProperties().find(name);
    if (it == GetProperties().end()) QMX_CORR_THROW(PropertyDoesNotExist, name.c_str());
    if (it->second.GetType() != Qmx_CorrPropertyValue::kINT32)
        QMX_CORR_THROW(IncorrectPropertyType, name.c_str());
    return it->second.GetINT32();
}

const Vesk::StringBase<char>& Qmx_CorrObject::GetProperty_String(const Vesk::StringBase<char>& name,
                                                                 const char* accessor) const {
    CheckAccessor(name, accessor);
    auto it = GetProperties().find(name);
    if (it == GetProperties().end()) QMX_CORR_THROW(PropertyDoesNotExist, name.c_str());
    if (it->second.GetType() != Qmx_CorrPropertyValue::kString)
        QMX_CORR_THROW(IncorrectPropertyType, name.c_str());
    return it->second.GetString();
}

void Qmx_CorrObject::SetProperty_INT32(const Vesk::StringBase<char>& name, int value,
                                       const char* accessor) {
    Qmx_CorrObjectData* data = GetObjectDataForWrite();
    CheckAccessor(name, accessor);
    data->GetPropertiesForWrite()[name].SetINT32(value);
    MarkModified(data);
}

void Qmx_CorrObject::SetProperty_String(const Vesk::StringBase<char>& name,
                                        const Vesk::StringBase<char>& value, const char* accessor) {
    // Copied first: `value` may be a reference into the very property it replaces.
    const Vesk::StringBase<char> copy = value;
    Qmx_CorrObjectData* data = GetObjectDataForWrite();
    CheckAccessor(name, accessor);
    data->GetPropertiesForWrite()[name].SetString(copy);
    MarkModified(data);
}

void Qmx_CorrObject::DestroyProperty(const Vesk::StringBase<char>& name, const char* accessor) {
    if (!HasProperty(name)) return;
    CheckAccessor(name, accessor);
    Qmx_CorrObjectData* data = GetObjectDataForWrite();
    data->GetPropertiesForWrite().erase(name);
    MarkModified(data);
}
