#include "Qmx_CorrObjectData.h"

#include <map>

#include "Qmx_CorrException.h"
#include "Qmx_CorrStorage.h"

namespace {
const char* const kSourceFile = "s/Qmx_CorrObjectData";
const char* const kRevision = "1";

// The fewest bytes one property takes in a record: an empty name, the tag and an integer.
const unsigned int kMinPropertyBytes = 12;

typedef std::map<Qmx_CorrObjectOwner*, boost::shared_ptr<Qmx_CorrObjectData>> DefaultTable;

// Lives from library load to unload, as the defaults of every open database do.
DefaultTable g_defaults;

}  // namespace

Qmx_CorrObjectData::Qmx_CorrObjectData(Qmx_CorrObjectOwner* owner) : m_owner(owner) {}

Qmx_CorrObjectData::Qmx_CorrObjectData(Qmx_CorrObjectOwner* owner, Qmx_CorrStorage& storage)
    : m_owner(owner) {
    ReadPropertyMap(storage, m_properties);
}

Qmx_CorrObjectData::~Qmx_CorrObjectData() = default;

void Qmx_CorrObjectData::Archive(Qmx_CorrStorage& storage) const {
    WritePropertyMap(storage, m_properties);
}

void Qmx_CorrObjectData::WritePropertyMap(Qmx_CorrStorage& storage,
                                          const Qmx_CorrPropertyMap& map) {
    storage.WriteUINT32(static_cast<unsigned int>(map.size()));
    for (const auto& entry : map) {
        const Qmx_CorrPropertyValue& value = entry.second;
        if (value.GetType() > Qmx_CorrPropertyValue::kString) QMX_CORR_THROW(IncorrectPropertyType);
        storage.WriteString(entry.first);
        storage.WriteUINT32(value.GetType());
        if (value.GetType() == Qmx_CorrPropertyValue::kINT32)
            storage.WriteUINT32(static_cast<unsigned int>(value.GetINT32()));
        else
            storage.WriteString(value.GetString());
    }
}

void Qmx_CorrObjectData::ReadPropertyMap(Qmx_CorrStorage& storage, Qmx_CorrPropertyMap& map) {
    map.clear();
    const unsigned int count = storage.ReadUINT32();
    storage.CheckCount(count, kMinPropertyBytes);
    for (unsigned int i = 0; i < count; ++i) {
        const Vesk::StringBase<char> name = storage.ReadString();
        const unsigned int type = storage.ReadUINT32();
        Qmx_CorrPropertyValue value;
        if (type == Qmx_CorrPropertyValue::kString)
            value.SetString(storage.ReadString());
        else if (type == Qmx_CorrPropertyValue::kINT32)
            value.SetINT32(static_cast<int>(storage.ReadUINT32()));
        else
            QMX_CORR_THROW(IncorrectPropertyType);
        map[name] = value;
    }
}

boost::shared_ptr<Qmx_CorrObjectData> Qmx_CorrObjectData::GetDefaultObjectData(
    Qmx_CorrObjectOwner* owner) {
    boost::shared_ptr<Qmx_CorrObjectData>& entry = g_defaults[owner];
    if (!entry) entry.reset(new Qmx_CorrObjectData(owner));
    return entry;
}

boost::shared_ptr<Qmx_CorrObjectData> Qmx_CorrObjectData::CreateObjectData(
    Qmx_CorrObjectOwner* owner) {
    return boost::shared_ptr<Qmx_CorrObjectData>(new Qmx_CorrObjectData(owner));
}

void Qmx_CorrObjectData::ReleaseDefaultObjectData(Qmx_CorrObjectOwner* owner) {
    g_defaults.erase(owner);
}

void Qmx_CorrObjectData::ArchiveObjectData(Qmx_CorrStorage& storage,
                                           const boost::shared_ptr<Qmx_CorrObjectData>& record) {
    storage.GetData().objectDataVersion = 1;
    const bool isPrivate = record.use_count() == 1;
    storage.WriteBool(isPrivate);
    if (isPrivate) record->Archive(storage);
}

boost::shared_ptr<Qmx_CorrObjectData> Qmx_CorrObjectData::RestoreObjectData(
    Qmx_CorrStorage& storage, Qmx_CorrObjectOwner* owner) {
    if (storage.GetData().objectDataVersion != 1)
        QMX_CORR_THROW(InvalidDatabaseFormat, storage.GetName().c_str());
    if (!storage.ReadBool()) return GetDefaultObjectData(owner);
    boost::shared_ptr<Qmx_CorrObjectData> record(new Qmx_CorrObjectData(owner, storage));
    return record;
}
