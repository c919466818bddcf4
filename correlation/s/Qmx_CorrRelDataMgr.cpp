#include "Qmx_CorrRelDataMgr.h"

#include <iostream>
#include <typeinfo>

#include "Qmx_CorrDbg.h"
#include "Qmx_CorrException.h"
#include "Qmx_CorrStorage.h"

namespace {
const char* const kSourceFile = "s/Qmx_CorrRelDataMgr";
const char* const kRevision = "1";

const unsigned int kFormat = 0;
enum : unsigned char { kFreeSlot = 0, kSharedRecord = 1, kPrivateRecord = 2 };

}  // namespace

Qmx_CorrRelDataMgr::Qmx_CorrRelDataMgr(Qmx_CorrObjectOwner* owner)
    : m_owner(owner), m_default(new Qmx_CorrRelData(owner, Vesk::StringBase<char>())) {
    m_table.Append(m_default);
}

boost::shared_ptr<Qmx_CorrRelData> Qmx_CorrRelDataMgr::CreateData(
    const Vesk::StringBase<char>& name) {
    boost::shared_ptr<Qmx_CorrRelData> record(new Qmx_CorrRelData(m_owner, name));
    m_table.Add(record);
    return record;
}

boost::shared_ptr<Qmx_CorrRelData> Qmx_CorrRelDataMgr::GetData(unsigned int index) const {
    if (index >= m_table.GetSize())
        QMX_CORR_THROW(InvalidRequest, "Qmx_CorrRelDataMgr::GetData: index beyond the table");
    return m_table.GetSlot(index);
}

unsigned int Qmx_CorrRelDataMgr::GetIndex(const Qmx_CorrRelData* record) const {
    unsigned int slot = 0;
    if (!m_table.Find(record, slot))
        QMX_CORR_THROW(InvalidRequest, "Qmx_CorrRelDataMgr::GetIndex: the record is in no slot");
    return slot;
}

void Qmx_CorrRelDataMgr::ReleaseData(const boost::shared_ptr<Qmx_CorrRelData>& record) {
    if (record.use_count() == 2 && record != m_default) m_table.Free(record.get());
}

void Qmx_CorrRelDataMgr::Archive(Qmx_CorrStorage& storage) const {
    storage.WriteUINT32(kFormat);
    storage.WriteUINT32(m_table.GetFreeSlots());
    storage.WriteUINT32(static_cast<unsigned int>(m_table.GetSize() - 1));
    for (std::size_t i = 1; i < m_table.GetSize(); ++i) {
        const boost::shared_ptr<Qmx_CorrRelData>& record = m_table.GetSlot(i);
        if (!record) {
            storage.WriteUINT8(kFreeSlot);
            continue;
        }
        storage.WriteUINT8(record.use_count() == 2 ? kPrivateRecord : kSharedRecord);
        record->Archive(storage);
    }
}

void Qmx_CorrRelDataMgr::Restore(Qmx_CorrStorage& storage) {
    m_table.Clear();
    m_table.Append(m_default);
    if (storage.ReadUINT32() != kFormat)
        QMX_CORR_THROW(InvalidDatabaseFormat, storage.GetName().c_str());
    m_table.SetFreeSlots(storage.ReadUINT32());
    const unsigned int count = storage.ReadUINT32();
    storage.CheckCount(count, 1);
    m_table.Reserve(static_cast<std::size_t>(count) + 1);
    for (unsigned int i = 0; i < count; ++i) {
        const unsigned char kind = storage.ReadUINT8();
        if (kind == kFreeSlot) {
            m_table.Append(boost::shared_ptr<Qmx_CorrRelData>());
            continue;
        }
        if (kind > kPrivateRecord) QMX_CORR_THROW(InvalidDatabaseFormat, storage.GetName().c_str());
        m_table.Append(boost::shared_ptr<Qmx_CorrRelData>(new Qmx_CorrRelData(m_owner, storage)));
    }
}

void Qmx_CorrRelDataMgr::DbgDump(std::ostream& out, unsigned indent) const {
    Qmx_CorrDbg::PrintEmptyBlock(out, indent, Qmx_CorrDbg::GetDumpName(typeid(Qmx_CorrRelDataMgr)));
}

void Qmx_CorrRelDataMgr::DbgDump() const { DbgDump(std::cerr, 0); }
