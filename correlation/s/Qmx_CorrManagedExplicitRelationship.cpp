#include "Qmx_CorrManagedExplicitRelationship.h"

#include <algorithm>
#include <iostream>
#include <iterator>
#include <typeinfo>
#include <vector>

#include "Qmx_CorrDbg.h"
#include "Qmx_CorrException.h"
#include "Qmx_CorrManagedItem.h"
#include "Qmx_CorrObjectOwner.h"
#include "Qmx_CorrRelDataMgr.h"
#include "Qmx_CorrRelItemOverflowMgr.h"
#include "Qmx_CorrStorage.h"
#include "Qmx_CorrStorageData.h"
#include "Vesk_MsgManData.h"

namespace {

constexpr const char* kSourceFile = "s/Qmx_CorrManagedExplicitRelationship";
constexpr const char* kRevision = "1";

constexpr unsigned int kRecordSize = 28;
// Handles each side keeps in the record; longer sides live in the overflow lists.
constexpr unsigned int kInlineHandles = 2;
// Handles below this name no pool slot (Qmx_CorrObjMgrT: the first pool's base is 128).
constexpr unsigned int kFirstHandle = 128;

enum ListSelector : int {
    kSources = Qmx_CorrRelItemOverflowMgrI::kSources,
    kDestinations = Qmx_CorrRelItemOverflowMgrI::kDestinations
};

// The items of `handles`, in order. A handle that names no item (only a damaged database has
// one) is left out rather than handed on as null.
template <class Ptr>
Qmx_SingleOptContainerT<Ptr> ResolveItems(Qmx_CorrObjectOwner* owner,
                                          const Qmx_CorrHandleList& handles) {
    Qmx_SingleOptContainerT<Ptr> result;
    result.Reserve(handles.Size());
    for (std::size_t i = 0; i < handles.Size(); ++i) {
        if (Ptr item = owner->GetItemPtr(handles.Get(i))) result.PushBack(item);
    }
    return result;
}

// The pool handle of a caller's item; 0 when it is no item of this database (an item of
// another class, or of another database's pools).
unsigned int HandleOf(Qmx_CorrObjectOwner* owner, Qmx_CorrItem* item) {
    const auto* managed = dynamic_cast<const Qmx_CorrManagedItem*>(item);
    return managed ? owner->GetItemHandle(managed) : 0;
}

Qmx_CorrRelItemOverflowMgr* OverflowFor(Qmx_CorrObjectOwner* owner) {
    Qmx_CorrRelItemOverflowMgr* overflow = owner->GetRelItemOverflowMgr();
    if (!overflow) {
        QMX_CORR_THROW(InvalidRequest, "Qmx_CorrManagedExplicitRelationship: no overflow lists");
    }
    return overflow;
}

[[noreturn]] void Refuse(const Qmx_CorrStorage& storage) {
    QMX_CORR_THROW(InvalidDatabaseFormat, storage.GetName().c_str());
}

// The record a data index names; a free slot has none.
boost::shared_ptr<Qmx_CorrRelData> RestoreData(Qmx_CorrStorage& storage,
                                               Qmx_CorrObjectOwner* owner) {
    const Qmx_CorrRelDataMgr* dataMgr = owner->GetRelDataMgr();
    const unsigned int index = storage.ReadUINT32();
    if (index >= dataMgr->GetSlotCount()) Refuse(storage);
    boost::shared_ptr<Qmx_CorrRelData> data = dataMgr->GetData(index);
    if (!data) Refuse(storage);
    return data;
}

void CheckHandle(const Qmx_CorrStorage& storage, unsigned int handle) {
    if (handle < kFirstHandle) Refuse(storage);
}

// Up to two handles inline, then fillers; a longer side comes from the overflow lists, which
// hold exactly that many, since the record was written together with them.
void RestoreSide(Qmx_CorrStorage& storage, const Qmx_CorrManagedExplicitRelationship* rel,
                 Qmx_CorrObjectOwner* owner, Qmx_CorrHandleList& list, int selector) {
    const unsigned int count = storage.ReadUINT32();
    if (count <= kInlineHandles) {
        for (unsigned int i = 0; i < count; ++i) {
            const unsigned int handle = storage.ReadUINT32();
            CheckHandle(storage, handle);
            list.Add(handle);
        }
        for (unsigned int i = count; i < kInlineHandles; ++i) storage.ReadUINT32();
        return;
    }
    const std::vector<unsigned int> handles = OverflowFor(owner)->GetList(rel, selector);
    if (handles.size() != count) Refuse(storage);
    for (unsigned int handle : handles) CheckHandle(storage, handle);
    list.Assign(handles);
    for (unsigned int i = 0; i < kInlineHandles; ++i) storage.ReadUINT32();
}

void ArchiveSide(Qmx_CorrStorage& storage, const Qmx_CorrManagedExplicitRelationship* rel,
                 Qmx_CorrObjectOwner* owner, const Qmx_CorrHandleList& list, int selector) {
    const std::size_t count = list.Size();
    const bool fitsInline = count <= kInlineHandles;
    if (!fitsInline) OverflowFor(owner)->SetList(rel, selector, list.ToVector());
    storage.WriteUINT32(static_cast<unsigned int>(count));
    for (unsigned int i = 0; i < kInlineHandles; ++i) {
        storage.WriteUINT32(fitsInline && i < count ? list.Get(i) : 0);
    }
}

std::vector<unsigned int> Sorted(const Qmx_CorrHandleList& list) {
    std::vector<unsigned int> handles = list.ToVector();
    std::sort(handles.begin(), handles.end());
    return handles;
}

// The first handle that stands twice in a sorted list, or 0.
unsigned int FirstDuplicate(const std::vector<unsigned int>& sorted) {
    auto it = std::adjacent_find(sorted.begin(), sorted.end());
    return it == sorted.end() ? 0 : *it;
}

bool Intersect(const std::vector<unsigned int>& a, const std::vector<unsigned int>& b) {
    std::vector<unsigned int> both;
    std::set_intersection(a.begin(), a.end(), b.begin(), b.end(), std::back_inserter(both));
    return !both.empty();
}

// The name diagnostics give an item handle; a handle that names no item says so.
Vesk::StringBase<char> ItemName(Qmx_CorrObjectOwner* owner, unsigned int handle) {
    const Qmx_CorrManagedItem* item = owner->GetItemPtr(handle);
    return item ? item->GetAbsoluteName() : Vesk::StringBase<char>("NULL");
}

// The first item of `list` whose own list (`linksOf`) lacks `rel`, or 0.
template <class Links>
unsigned int FirstUnlinked(Qmx_CorrObjectOwner* owner, const Qmx_CorrHandleList& list,
                           const Qmx_CorrExplicitRelationship* rel, Links linksOf) {
    for (std::size_t i = 0; i < list.Size(); ++i) {
        const Qmx_CorrManagedItem* item = owner->GetItemPtr(list.Get(i));
        if (!item) return list.Get(i);
        const auto links = linksOf(*item);
        if (std::find(links.begin(), links.end(), rel) == links.end()) return list.Get(i);
    }
    return 0;
}

Qmx_SingleOptContainerT<const Qmx_CorrExplicitRelationship*> Outgoing(
    const Qmx_CorrManagedItem& item) {
    return item.GetOutgoingRelationships();
}
Qmx_SingleOptContainerT<const Qmx_CorrExplicitRelationship*> Incoming(
    const Qmx_CorrManagedItem& item) {
    return item.GetIncomingRelationships();
}

}  // namespace

Qmx_CorrManagedExplicitRelationship::~Qmx_CorrManagedExplicitRelationship() = default;

Qmx_CorrManagedExplicitRelationship::Qmx_CorrManagedExplicitRelationship(Qmx_CorrObjectOwner* owner)
    : m_data(owner->GetRelDataMgr()->GetDefaultData()) {}

Qmx_CorrManagedExplicitRelationship::Qmx_CorrManagedExplicitRelationship(
    Qmx_CorrStorage& storage, Qmx_CorrObjectOwner* owner) {
    if (storage.GetData().expRelVersion != Qmx_CorrStorageData::kExpRelVersion) Refuse(storage);
    storage.CheckCount(1, kRecordSize);
    m_data = RestoreData(storage, owner);
    RestoreSide(storage, this, owner, m_sources, kSources);
    RestoreSide(storage, this, owner, m_destinations, kDestinations);
}

const Qmx_CorrObjectData* Qmx_CorrManagedExplicitRelationship::GetObjectData() const {
    return m_data.get();
}

Qmx_CorrObjectData* Qmx_CorrManagedExplicitRelationship::GetObjectDataForWrite() {
    // The table slot and this relationship: the record is the relationship's own.
    if (m_data.use_count() != 2)
        m_data = GetOwner()->GetRelDataMgr()->CreateData(m_data->GetName());
    return m_data.get();
}

Vesk::StringBase<char> Qmx_CorrManagedExplicitRelationship::GetName() const {
    return m_data->GetName();
}

bool Qmx_CorrManagedExplicitRelationship::DbgValidateState() const {
    Qmx_CorrObjectOwner* const owner = GetOwner();
    const std::vector<unsigned int> sources = Sorted(m_sources);
    const std::vector<unsigned int> destinations = Sorted(m_destinations);
    if (const unsigned int twice = FirstDuplicate(sources)) {
        Vesk_MsgManData::debugStub("Relationship contains source item '%s' multiple times\n",
                                   ItemName(owner, twice).c_str());
        return false;
    }
    if (const unsigned int twice = FirstDuplicate(destinations)) {
        Vesk_MsgManData::debugStub("Relationship contains destination item '%s' multiple times\n",
                                   ItemName(owner, twice).c_str());
        return false;
    }
    if (Intersect(sources, destinations)) {
        Vesk_MsgManData::debugStub(
            "Relationship contains duplicate source and destination items.\n");
        return false;
    }
    if (const unsigned int unlinked = FirstUnlinked(owner, m_sources, this, Outgoing)) {
        Vesk_MsgManData::debugStub(
            "Relationship has item '%s' as a source but the item does not list this "
            "relationship.\n",
            ItemName(owner, unlinked).c_str());
        return false;
    }
    if (const unsigned int unlinked = FirstUnlinked(owner, m_destinations, this, Incoming)) {
        Vesk_MsgManData::debugStub(
            "Relationship has item '%s' as a destination but the item does not list this "
            "relationship.\n",
            ItemName(owner, unlinked).c_str());
        return false;
    }
    return Qmx_CorrExplicitRelationship::DbgValidateState();
}

void Qmx_CorrManagedExplicitRelationship::DbgDump(std::ostream& out, unsigned indent) const {
    Qmx_CorrDbg::Println(
        out, indent,
        "%s:", Qmx_CorrDbg::GetDumpName(typeid(Qmx_CorrManagedExplicitRelationship)).c_str());
    Qmx_CorrDbg::Println(out, indent, "{");
    Qmx_CorrObject::DbgDump(out, indent + 1);
    Qmx_CorrDbg::Println(out, indent, "}");
}

void Qmx_CorrManagedExplicitRelationship::DbgDump() const { DbgDump(std::cerr, 0); }

Qmx_SingleOptContainerT<const Qmx_CorrItem*> Qmx_CorrManagedExplicitRelationship::GetSrcItems()
    const {
    return ResolveItems<const Qmx_CorrItem*>(GetOwner(), m_sources);
}

Qmx_SingleOptContainerT<Qmx_CorrItem*> Qmx_CorrManagedExplicitRelationship::GetSrcItems() {
    return ResolveItems<Qmx_CorrItem*>(GetOwner(), m_sources);
}

Qmx_SingleOptContainerT<const Qmx_CorrItem*> Qmx_CorrManagedExplicitRelationship::GetDstItems()
    const {
    return ResolveItems<const Qmx_CorrItem*>(GetOwner(), m_destinations);
}

Qmx_SingleOptContainerT<Qmx_CorrItem*> Qmx_CorrManagedExplicitRelationship::GetDstItems() {
    return ResolveItems<Qmx_CorrItem*>(GetOwner(), m_destinations);
}

void Qmx_CorrManagedExplicitRelationship::AddSrcItem(Qmx_CorrItem* item) {
    if (!item) QMX_CORR_THROW(InvalidSrcItem);
    Qmx_CorrObjectOwner* const owner = GetOwner();
    const unsigned int handle = HandleOf(owner, item);
    // A handle of 0 would be stored as a link to nothing.
    if (handle == 0) QMX_CORR_THROW(InvalidSrcItem, item->GetAbsoluteName().c_str());
    if (m_destinations.Contains(handle)) QMX_CORR_THROW(SrcAndDstIdentical);
    if (m_sources.Contains(handle)) return;
    QMX_CORR_TRACE("BUILD", 10,
                   "Adding item '" << item->GetAbsoluteName() << "' to explicit relationship.");
    m_sources.Add(handle);
    owner->LinkRelationshipItem(this, item, Qmx_CorrObjectOwner::kSourceEnd);
}

void Qmx_CorrManagedExplicitRelationship::RemoveSrcItem(Qmx_CorrItem* item) {
    if (!item) return;
    Qmx_CorrObjectOwner* const owner = GetOwner();
    if (m_sources.Remove(HandleOf(owner, item))) {
        owner->UnlinkRelationshipItem(this, item, Qmx_CorrObjectOwner::kSourceEnd);
    }
}

void Qmx_CorrManagedExplicitRelationship::AddDstItem(Qmx_CorrItem* item) {
    if (!item) QMX_CORR_THROW(InvalidDstItem);
    Qmx_CorrObjectOwner* const owner = GetOwner();
    const unsigned int handle = HandleOf(owner, item);
    if (handle == 0) QMX_CORR_THROW(InvalidDstItem, item->GetAbsoluteName().c_str());
    if (m_sources.Contains(handle)) QMX_CORR_THROW(SrcAndDstIdentical);
    if (m_destinations.Contains(handle)) return;
    m_destinations.Add(handle);
    owner->LinkRelationshipItem(this, item, Qmx_CorrObjectOwner::kDestinationEnd);
}

void Qmx_CorrManagedExplicitRelationship::RemoveDstItem(Qmx_CorrItem* item) {
    if (!item) return;
    Qmx_CorrObjectOwner* const owner = GetOwner();
    if (m_destinations.Remove(HandleOf(owner, item))) {
        owner->UnlinkRelationshipItem(this, item, Qmx_CorrObjectOwner::kDestinationEnd);
    }
}

void Qmx_CorrManagedExplicitRelationship::Delete() {
    Qmx_CorrObjectOwner* const owner = GetOwner();
    owner->GetRelDataMgr()->ReleaseData(m_data);
    owner->DeleteExplicitRelationship(this);
}

void Qmx_CorrManagedExplicitRelationship::Archive(Qmx_CorrStorage& storage) const {
    Qmx_CorrObjectOwner* const owner = GetOwner();
    const unsigned int dataIndex = owner->GetRelDataMgr()->GetIndex(m_data.get());
    storage.GetData().expRelVersion = Qmx_CorrStorageData::kExpRelVersion;
    storage.WriteUINT32(dataIndex);
    ArchiveSide(storage, this, owner, m_sources, kSources);
    ArchiveSide(storage, this, owner, m_destinations, kDestinations);
}

unsigned int Qmx_CorrManagedExplicitRelationship::GetArchiveSize(Qmx_CorrObjectOwner*) {
    return kRecordSize;
}
