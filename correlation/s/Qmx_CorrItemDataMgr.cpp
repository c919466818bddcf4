#include "Qmx_CorrItemDataMgr.h"

#include <iostream>
#include <typeinfo>

#include "Qmx_CorrDbg.h"
#include "Qmx_CorrException.h"
#include "Qmx_CorrStorage.h"

namespace {
const char* const kSourceFile = "s/Qmx_CorrItemDataMgr";
const char* const kRevision = "1";

const unsigned int kFormat = 0;
enum : unsigned char { kFreeSlot = 0, kDefaultRecord = 1, kOtherRecord = 2 };

}  // namespace

Qmx_CorrItemDataMgr::Qmx_CorrItemDataMgr(Qmx_CorrObjectOwner* owner) : m_owner(owner) {}

boost::shared_ptr<Qmx_CorrItemData> Qmx_CorrItemDataMgr::GetDefaultData(
    Qmx_CorrContainer* container) {
    boost::shared_ptr<Qmx_CorrItemData>& entry = m_defaults[container];
    if (!entry) {
        entry.reset(new Qmx_CorrItemData(m_owner, container));
        m_table.Add(entry);
    }
    return entry;
}

boost::shared_ptr<Qmx_CorrItemData> Qmx_CorrItemDataMgr::CreateData(Qmx_CorrContainer* container) {
    boost::shared_ptr<Qmx_CorrItemData> record(new Qmx_CorrItemData(m_owner, container));
    m_table.Add(record);
    return record;
}

boost::shared_ptr<Qmx_CorrItemData> Qmx_CorrItemDataMgr::GetData(unsigned int index) const {
    if (index >= m_table.GetSize())
        QMX_CORR_THROW(InvalidRequest, "Qmx_CorrItemDataMgr::GetData: index beyond the table");
    return m_table.GetSlot(index);
}

unsigned int Qmx_CorrItemDataMgr::GetIndex(const Qmx_CorrItemData* record) const {
    unsigned int slot = 0;
    if (!m_table.Find(record, slot))
        QMX_CORR_THROW(InvalidRequest, "Qmx_CorrItemDataMgr::GetIndex: the record is in no slot");
    return slot;
}

void Qmx_CorrItemDataMgr::ReleaseData(const boost::shared_ptr<Qmx_CorrItemData>& record) {
    if (record.use_count() == 2) m_table.Free(record.get());
}

void Qmx_CorrItemDataMgr::RemoveContainer(Qmx_CorrContainer* container) {
    auto it = m_defaults.find(container);
    if (it == m_defaults.end()) return;
    const boost::shared_ptr<Qmx_CorrItemData> record = it->second;
    m_defaults.erase(it);
    m_table.Free(record.get());
}

void Qmx_CorrItemDataMgr::Archive(Qmx_CorrStorage& storage) const {
    storage.WriteUINT32(kFormat);
    storage.WriteUINT32(m_table.GetFreeSlots());
    storage.WriteUINT32(static_cast<unsigned int>(m_table.GetSize()));
    for (std::size_t i = 0; i < m_table.GetSize(); ++i) {
        const boost::shared_ptr<Qmx_CorrItemData>& record = m_table.GetSlot(i);
        if (!record) {
            storage.WriteUINT8(kFreeSlot);
            continue;
        }
        // Decided by the defaults map, not by how many items hold the record now: a private
        // record whose item is not in memory must come back private.
        auto it = m_defaults.find(record->GetContainer());
        const bool isDefault = it != m_defaults.end() && it->second == record;
        storage.WriteUINT8(isDefault ? kDefaultRecord : kOtherRecord);
        record->Archive(storage);
    }
}

void Qmx_CorrItemDataMgr::Restore(Qmx_CorrStorage& storage) {
    m_table.Clear();
    m_defaults.clear();
    if (storage.ReadUINT32() != kFormat)
        QMX_CORR_THROW(InvalidDatabaseFormat, storage.GetName().c_str());
    m_table.SetFreeSlots(storage.ReadUINT32());
    const unsigned int count = storage.ReadUINT32();
    storage.CheckCount(count, 1);
    m_table.Reserve(count);
    for (unsigned int i = 0; i < count; ++i) {
        const unsigned char kind = storage.ReadUINT8();
        if (kind == kFreeSlot) {
            m_table.Append(boost::shared_ptr<Qmx_CorrItemData>());
            continue;
        }
        if (kind > kOtherRecord) QMX_CORR_THROW(InvalidDatabaseFormat, storage.GetName().c_str());
        boost::shared_ptr<Qmx_CorrItemData> record(new Qmx_CorrItemData(m_owner, storage));
        m_table.Append(record);
        if (kind == kDefaultRecord) m_defaults[record->GetContainer()] = record;
    }
}

void Qmx_CorrItemDataMgr::DbgDump(std::ostream& out, unsigned indent) const {
    Qmx_CorrDbg::PrintEmptyBlock(out, indent,
                                 Qmx_CorrDbg::GetDumpName(typeid(Qmx_CorrItemDataMgr)));
}

void Qmx_CorrItemDataMgr::DbgDump() const { DbgDump(std::cerr, 0); }
