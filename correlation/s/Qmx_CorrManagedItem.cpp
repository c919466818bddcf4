#include "Qmx_CorrManagedItem.h"

#include <algorithm>
#include <iostream>
#include <typeinfo>
#include <vector>

#include "Qmx_CorrDbg.h"
#include "Qmx_CorrException.h"
#include "Qmx_CorrItemDataMgr.h"
#include "Qmx_CorrItemRelOverflowMgr.h"
#include "Qmx_CorrManagedContainer.h"
#include "Qmx_CorrManagedExplicitRelationship.h"
#include "Qmx_CorrNameRepository.h"
#include "Qmx_CorrObjectOwner.h"
#include "Qmx_CorrStorage.h"
#include "Qmx_CorrStorageData.h"
#include "Vesk_MsgManData.h"

namespace {

constexpr const char* kSourceFile = "s/Qmx_CorrManagedItem";
constexpr const char* kRevision = "1";

// The fixed part of a record besides the name: data index and two (count, value) pairs.
constexpr unsigned int kFixedRecordSize = 20;
// Handles below this name no pool slot (Qmx_CorrObjMgrT: the first pool's base is 128).
constexpr unsigned int kFirstHandle = 128;

enum ListSelector : int {
    kIncoming = Qmx_CorrItemRelOverflowMgrI::kIncoming,
    kOutgoing = Qmx_CorrItemRelOverflowMgrI::kOutgoing
};

// The relationships of `handles`, in order. A handle that names no relationship (only a
// damaged database has one) is left out rather than handed on as null.
template <class Ptr>
Qmx_SingleOptContainerT<Ptr> ResolveRelationships(Qmx_CorrObjectOwner* owner,
                                                  const Qmx_CorrHandleList& handles) {
    Qmx_SingleOptContainerT<Ptr> result;
    result.Reserve(handles.Size());
    for (std::size_t i = 0; i < handles.Size(); ++i) {
        if (Ptr rel = owner->GetExpRelPtr(handles.Get(i))) result.PushBack(rel);
    }
    return result;
}

bool HasDuplicate(std::vector<unsigned int> handles) {
    std::sort(handles.begin(), handles.end());
    return std::adjacent_find(handles.begin(), handles.end()) != handles.end();
}

Qmx_CorrItemRelOverflowMgr* OverflowFor(Qmx_CorrObjectOwner* owner) {
    Qmx_CorrItemRelOverflowMgr* overflow = owner->GetItemRelOverflowMgr();
    if (!overflow) QMX_CORR_THROW(InvalidRequest, "Qmx_CorrManagedItem: no overflow lists");
    return overflow;
}

[[noreturn]] void Refuse(const Qmx_CorrStorage& storage) {
    QMX_CORR_THROW(InvalidDatabaseFormat, storage.GetName().c_str());
}

// The record a data index names. A free slot has no record: the item would have neither
// parent nor properties.
boost::shared_ptr<Qmx_CorrItemData> RestoreData(Qmx_CorrStorage& storage,
                                                Qmx_CorrObjectOwner* owner) {
    const Qmx_CorrItemDataMgr* dataMgr = owner->GetItemDataMgr();
    const unsigned int index = storage.ReadUINT32();
    if (index >= dataMgr->GetSlotCount()) Refuse(storage);
    boost::shared_ptr<Qmx_CorrItemData> data = dataMgr->GetData(index);
    if (!data) Refuse(storage);
    return data;
}

// Count 1 keeps its handle inline; more live in the overflow lists, which hold exactly that
// many, since the record was written together with them.
void RestoreList(Qmx_CorrStorage& storage, const Qmx_CorrManagedItem* item,
                 Qmx_CorrObjectOwner* owner, Qmx_CorrHandleList& list, int selector) {
    const unsigned int count = storage.ReadUINT32();
    const unsigned int value = storage.ReadUINT32();
    if (count == 1) {
        if (value < kFirstHandle) Refuse(storage);
        list.Add(value);
    } else if (count > 1) {
        const std::vector<unsigned int> handles = OverflowFor(owner)->GetList(item, selector);
        if (handles.size() != count) Refuse(storage);
        for (unsigned int handle : handles) {
            if (handle < kFirstHandle) Refuse(storage);
        }
        list.Assign(handles);
    }
}

void ArchiveList(Qmx_CorrStorage& storage, const Qmx_CorrManagedItem* item,
                 Qmx_CorrObjectOwner* owner, const Qmx_CorrHandleList& list, int selector) {
    const std::size_t count = list.Size();
    if (count > 1) OverflowFor(owner)->SetList(item, selector, list.ToVector());
    storage.WriteUINT32(static_cast<unsigned int>(count));
    storage.WriteUINT32(count == 1 ? list.Get(0) : 0);
}

// The handles of `list` whose relationships have exactly one item on the side `sideOf`
// gives, in list order.
template <class Side>
void CollectSoleLinks(Qmx_CorrObjectOwner* owner, const Qmx_CorrHandleList& list, Side sideOf,
                      std::vector<unsigned int>& doomed) {
    for (std::size_t i = 0; i < list.Size(); ++i) {
        const Qmx_CorrManagedExplicitRelationship* rel = owner->GetExpRelPtr(list.Get(i));
        if (rel && sideOf(*rel).Size() == 1) doomed.push_back(list.Get(i));
    }
}

// Whether every relationship of `list` has `self` on the side `sideOf` gives. A handle that
// names no relationship counts as one that does not list the item.
template <class Side>
bool AllListItem(Qmx_CorrObjectOwner* owner, const Qmx_CorrHandleList& list, unsigned int self,
                 Side sideOf) {
    for (std::size_t i = 0; i < list.Size(); ++i) {
        const Qmx_CorrManagedExplicitRelationship* rel = owner->GetExpRelPtr(list.Get(i));
        if (!rel || !sideOf(*rel).Contains(self)) return false;
    }
    return true;
}

const Qmx_CorrHandleList& Sources(const Qmx_CorrManagedExplicitRelationship& rel) {
    return rel.GetSrcHandles();
}
const Qmx_CorrHandleList& Destinations(const Qmx_CorrManagedExplicitRelationship& rel) {
    return rel.GetDstHandles();
}

}  // namespace

Qmx_CorrManagedItem::~Qmx_CorrManagedItem() {
    if (m_name.GetRecord()) GetOwner()->GetNameRepo()->DiscardName(m_name);
}

Qmx_CorrManagedItem::Qmx_CorrManagedItem(const Vesk::StringBase<char>& name,
                                         Qmx_CorrObjectOwner* owner, Qmx_CorrContainer* parent)
    : m_data(owner->GetItemDataMgr()->GetDefaultData(parent)),
      m_name(owner->GetNameRepo()->CreateName(name)) {}

Qmx_CorrManagedItem::Qmx_CorrManagedItem(Qmx_CorrNameHandle name, Qmx_CorrObjectOwner* owner,
                                         Qmx_CorrContainer* parent)
    : m_data(owner->GetItemDataMgr()->GetDefaultData(parent)),
      m_name(owner->GetNameRepo()->CopyName(name)) {}

Qmx_CorrManagedItem::Qmx_CorrManagedItem(Qmx_CorrStorage& storage, Qmx_CorrObjectOwner* owner) {
    if (storage.GetData().itemVersion != Qmx_CorrStorageData::kItemVersion)
        QMX_CORR_THROW(InvalidDatabaseFormat, storage.GetName().c_str());
    storage.CheckCount(1, GetArchiveSize(owner));
    m_data = RestoreData(storage, owner);
    m_name = owner->GetNameRepo()->RestoreName(storage);
    // The name record is this object's only field that its destructor would not free.
    try {
        if (!owner->GetNameRepo()->NamesStoredText(m_name))
            QMX_CORR_THROW(InvalidDatabaseFormat, storage.GetName().c_str());
        RestoreList(storage, this, owner, m_incoming, kIncoming);
        RestoreList(storage, this, owner, m_outgoing, kOutgoing);
    } catch (...) {
        owner->GetNameRepo()->DiscardName(m_name);
        throw;
    }
}

const Qmx_CorrObjectData* Qmx_CorrManagedItem::GetObjectData() const { return m_data.get(); }

Qmx_CorrObjectData* Qmx_CorrManagedItem::GetObjectDataForWrite() {
    // The table slot and this item: the record is the item's own.
    if (m_data.use_count() != 2) {
        m_data = GetOwner()->GetItemDataMgr()->CreateData(m_data->GetContainer());
    }
    return m_data.get();
}

Vesk::StringBase<char> Qmx_CorrManagedItem::GetName() const {
    return GetOwner()->GetNameRepo()->GetString(m_name);
}

bool Qmx_CorrManagedItem::DbgValidateState() const {
    Qmx_CorrObjectOwner* const owner = GetOwner();
    const unsigned int self = owner->GetItemHandle(this);
    const Vesk::StringBase<char> name = GetAbsoluteName();
    if (!AllListItem(owner, m_incoming, self, Destinations)) {
        Vesk_MsgManData::debugStub(
            "Item '%s' thinks it is a destination for a relationship but the relationship "
            "does not have it listed.\n",
            name.c_str());
        return false;
    }
    if (HasDuplicate(m_incoming.ToVector())) {
        Vesk_MsgManData::debugStub(
            "Item '%s' has an individual incoming relationship in its list more than once.\n",
            name.c_str());
        return false;
    }
    if (!AllListItem(owner, m_outgoing, self, Sources)) {
        Vesk_MsgManData::debugStub(
            "Item '%s' thinks it is a source for a relationship but the relationship does not "
            "have itlisted.\n",
            name.c_str());
        return false;
    }
    if (HasDuplicate(m_outgoing.ToVector())) {
        Vesk_MsgManData::debugStub(
            "Item '%s' has an individual outgoing relationship in its list more than once.\n",
            name.c_str());
        return false;
    }
    return Qmx_CorrItem::DbgValidateState();
}

void Qmx_CorrManagedItem::DbgDump(std::ostream& out, unsigned indent) const {
    Qmx_CorrDbg::Println(out, indent, "%s: '%s'",
                         Qmx_CorrDbg::GetDumpName(typeid(Qmx_CorrManagedItem)).c_str(),
                         GetName().c_str());
    Qmx_CorrDbg::Println(out, indent, "{");
    Qmx_CorrObject::DbgDump(out, indent + 1);
    Qmx_CorrDbg::Println(out, indent, "}");
}

void Qmx_CorrManagedItem::DbgDump() const { DbgDump(std::cerr, 0); }

Vesk::StringBase<char> Qmx_CorrManagedItem::GetAbsoluteName() const {
    const Qmx_CorrContainer* parent = GetParent();
    if (!parent) return GetName();
    return parent->GetAbsoluteName() + GetName();
}

const Qmx_CorrContainer* Qmx_CorrManagedItem::GetParent() const { return m_data->GetContainer(); }

Qmx_CorrContainer* Qmx_CorrManagedItem::GetParent() { return m_data->GetContainer(); }

Qmx_SingleOptContainerT<const Qmx_CorrExplicitRelationship*>
Qmx_CorrManagedItem::GetOutgoingRelationships() const {
    return ResolveRelationships<const Qmx_CorrExplicitRelationship*>(GetOwner(), m_outgoing);
}

Qmx_SingleOptContainerT<Qmx_CorrExplicitRelationship*>
Qmx_CorrManagedItem::GetOutgoingRelationships() {
    return ResolveRelationships<Qmx_CorrExplicitRelationship*>(GetOwner(), m_outgoing);
}

Qmx_SingleOptContainerT<const Qmx_CorrExplicitRelationship*>
Qmx_CorrManagedItem::GetIncomingRelationships() const {
    return ResolveRelationships<const Qmx_CorrExplicitRelationship*>(GetOwner(), m_incoming);
}

Qmx_SingleOptContainerT<Qmx_CorrExplicitRelationship*>
Qmx_CorrManagedItem::GetIncomingRelationships() {
    return ResolveRelationships<Qmx_CorrExplicitRelationship*>(GetOwner(), m_incoming);
}

void Qmx_CorrManagedItem::Delete(unsigned relMode) {
    Qmx_CorrObjectOwner* const owner = GetOwner();
    // Collected first: each Delete below takes its handle out of this item's lists. relMode
    // 1 and 2 doom the relationships with this item as their only source, 1 and 3 those with
    // it as their only destination; any other value dooms none.
    std::vector<unsigned int> doomed;
    if (relMode == 1 || relMode == 2) CollectSoleLinks(owner, m_outgoing, Sources, doomed);
    if (relMode == 1 || relMode == 3) CollectSoleLinks(owner, m_incoming, Destinations, doomed);
    for (unsigned int handle : doomed) {
        // Looked up again: a handle listed twice names a relationship already gone.
        if (Qmx_CorrManagedExplicitRelationship* rel = owner->GetExpRelPtr(handle)) rel->Delete();
    }
    if (auto* parent = dynamic_cast<Qmx_CorrManagedContainer*>(GetParent())) {
        parent->NotifyItemRemoved(this);
    }
    owner->GetItemDataMgr()->ReleaseData(m_data);
    owner->GetNameRepo()->ReleaseName(m_name);
    m_name = Qmx_CorrNameHandle();
    owner->DeleteItem(this);
}

void Qmx_CorrManagedItem::SetName(const Vesk::StringBase<char>& newName) {
    Qmx_CorrObjectOwner* const owner = GetOwner();
    Qmx_CorrNameRepository* const repo = owner->GetNameRepo();
    repo->ReleaseName(m_name);
    m_name = Qmx_CorrNameHandle();
    m_name = repo->CreateName(newName);
    owner->SetModified();
    const Vesk::StringBase<char> stored = repo->GetString(m_name);
    if (stored != newName) {
        Vesk_MsgManData::debugStub("eek RenameItem failed %s %s\n", newName.c_str(),
                                   stored.c_str());
    }
}

bool Qmx_CorrManagedItem::NameMatches(Qmx_CorrNameHandle name) const {
    return GetOwner()->GetNameRepo()->IsEqual(name, m_name);
}

void Qmx_CorrManagedItem::Archive(Qmx_CorrStorage& storage) const {
    Qmx_CorrObjectOwner* const owner = GetOwner();
    const unsigned int dataIndex = owner->GetItemDataMgr()->GetIndex(m_data.get());
    storage.GetData().itemVersion = Qmx_CorrStorageData::kItemVersion;
    storage.WriteUINT32(dataIndex);
    owner->GetNameRepo()->ArchiveName(storage, m_name);
    ArchiveList(storage, this, owner, m_incoming, kIncoming);
    ArchiveList(storage, this, owner, m_outgoing, kOutgoing);
}

unsigned int Qmx_CorrManagedItem::GetArchiveSize(Qmx_CorrObjectOwner* owner) {
    return kFixedRecordSize + owner->GetNameRepo()->GetNameArchiveSize();
}
