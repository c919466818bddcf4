#include "Qmx_CorrManagedContainer.h"

#include <algorithm>
#include <iostream>
#include <memory>
#include <set>
#include <typeinfo>

#include "Qmx_CorrDb.h"
#include "Qmx_CorrDbg.h"
#include "Qmx_CorrEvent.h"
#include "Qmx_CorrException.h"
#include "Qmx_CorrManagedImplicitRelationship.h"
#include "Qmx_CorrManagedItem.h"
#include "Qmx_CorrManagedItemMgr.h"
#include "Qmx_CorrNameRepository.h"
#include "Qmx_CorrObjectOwner.h"
#include "Qmx_CorrStorage.h"
#include "Qmx_CorrStorageData.h"
#include "Qmx_CorrStream.h"
#include "Qmx_CorrStreamCloser.h"
#include "Vesk_Endian.h"
#include "Vesk_MsgManData.h"

namespace {

constexpr const char* kSourceFile = "s/Qmx_CorrManagedContainer";
constexpr const char* kRevision = "1";

constexpr const char* kItemsStreamPrefix = "Container_Items";
constexpr int kItemsWriteMode = 14;  // write, truncate, portable
constexpr int kItemsReadMode = 9;    // read, portable
constexpr std::size_t kFirstItemReserve = 128;
constexpr unsigned int kHandleSize = 4;
constexpr unsigned int kMaxRelMode = 3;

// A name handle taken for one lookup and given back on every way out, a throw included.
class TempName {
public:
    TempName(Qmx_CorrNameRepository* repo, const Vesk::StringBase<char>& text)
        : m_repo(repo), m_handle(repo->CreateName(text)) {}
    ~TempName() { m_repo->ReleaseName(m_handle); }
    TempName(const TempName&) = delete;
    TempName& operator=(const TempName&) = delete;

    Qmx_CorrNameHandle Get() const { return m_handle; }

private:
    Qmx_CorrNameRepository* m_repo;
    Qmx_CorrNameHandle m_handle;
};

// The order of the item list, for the binary searches.
struct ItemLess {
    const Qmx_CorrNameRepository* repo;
    bool operator()(const Qmx_CorrManagedItem* item, Qmx_CorrNameHandle name) const {
        return repo->IsLess(item->GetNameHandle(), name);
    }
    bool operator()(Qmx_CorrNameHandle name, const Qmx_CorrManagedItem* item) const {
        return repo->IsLess(name, item->GetNameHandle());
    }
};

// Puts a flag back to what it was when the scope is left, however it is left.
class FlagRestorer {
public:
    explicit FlagRestorer(bool& flag) : m_flag(flag), m_saved(flag) {}
    ~FlagRestorer() { m_flag = m_saved; }
    FlagRestorer(const FlagRestorer&) = delete;
    FlagRestorer& operator=(const FlagRestorer&) = delete;

private:
    bool& m_flag;
    bool m_saved;
};

// The first name that occurs twice in `names`, or null.
const Vesk::StringBase<char>* FindDuplicate(std::vector<Vesk::StringBase<char>>& names) {
    std::sort(names.begin(), names.end());
    const auto found = std::adjacent_find(names.begin(), names.end());
    return found == names.end() ? nullptr : &*found;
}

// Room for one more entry, growing geometrically, so that the push or insert that follows
// cannot fail.
template <class T>
void ReserveOneMore(std::vector<T*>& list, std::size_t least) {
    if (list.size() < list.capacity()) return;
    list.reserve(std::max(least, 2 * list.size()));
}

template <class T>
bool Lists(const std::vector<T*>& list, const T* entry) {
    return std::find(list.begin(), list.end(), entry) != list.end();
}

template <class T>
void EraseFirst(std::vector<T*>& list, const T* entry) {
    const auto found = std::find(list.begin(), list.end(), entry);
    if (found != list.end()) list.erase(found);
}

}  // namespace

// Every notice of the subtree goes out before its first container is destroyed: a listener
// of one container may follow an implicit relationship to another container of the same
// closing tree. The order is that of destroying the tree one container after another.
Qmx_CorrManagedContainer::~Qmx_CorrManagedContainer() {
    NotifyDeletion();
    for (Qmx_CorrManagedContainer* child : m_containers) delete child;
    m_containers.clear();
    // Last: the absolute names of the children, read by their listeners, need this name.
    GetRepo()->ReleaseName(m_name);
}

void Qmx_CorrManagedContainer::NotifyDeletion() {
    if (m_deletionNotified) return;
    m_deletionNotified = true;
    Qmx_CorrEvent::GetCorrContainerDeletedEmitter().Fire(this);
    for (Qmx_CorrManagedContainer* child : m_containers) child->NotifyDeletion();
}

Qmx_CorrManagedContainer::Qmx_CorrManagedContainer(const Vesk::StringBase<char>& name,
                                                   Qmx_CorrObjectOwner* owner,
                                                   Qmx_CorrManagedContainer* parent)
    : m_data(Qmx_CorrObjectData::GetDefaultObjectData(owner)),
      m_parent(parent),
      m_name(owner->GetNameRepo()->CreateName(name)),
      m_notifyOnRemove(true),
      m_deletionNotified(false),
      m_itemsLoaded(true),
      m_itemsStreamCurrent(false),
      m_containerId(owner->GetNextContainerId()) {
    m_itemsStreamName.Format("%s_%u", kItemsStreamPrefix, m_containerId);
}

Qmx_CorrManagedContainer::Qmx_CorrManagedContainer(Qmx_CorrStorage& storage,
                                                   Qmx_CorrObjectOwner* owner)
    : m_parent(nullptr),
      m_notifyOnRemove(true),
      m_deletionNotified(false),
      m_itemsLoaded(false),
      m_itemsStreamCurrent(true),
      m_containerId(0) {
    if (storage.GetData().containerVersion != Qmx_CorrStorageData::kContainerVersion)
        QMX_CORR_THROW(InvalidDatabaseFormat, storage.GetName().c_str());
    m_data = Qmx_CorrObjectData::RestoreObjectData(storage, owner);
    m_parent = storage.ReadManagedContainerPtr();
    if (m_parent == this) QMX_CORR_THROW(InvalidDatabaseFormat, storage.GetName().c_str());
    m_name = owner->GetNameRepo()->RestoreName(storage);
    try {
        if (!owner->GetNameRepo()->NamesStoredText(m_name))
            QMX_CORR_THROW(InvalidDatabaseFormat, storage.GetName().c_str());
        m_itemsStreamName = storage.ReadString();
        m_containerId = storage.ReadUINT32();
        ReadRestoredLists(storage);
    } catch (...) {
        // The destructor does not run for a constructor that throws.
        owner->GetNameRepo()->DiscardName(m_name);
        throw;
    }
}

// A child listed twice, or the container itself, would be destroyed twice; a null entry would
// be followed by every walk of the tree. Whether each child names this container as its
// parent can only be seen once all records are read.
void Qmx_CorrManagedContainer::ReadRestoredLists(Qmx_CorrStorage& storage) {
    const char* const dbName = storage.GetName().c_str();
    const unsigned int children = storage.ReadUINT32();
    storage.CheckCount(children, 4);
    m_containers.reserve(children);
    std::set<const Qmx_CorrManagedContainer*> seen;
    for (unsigned int i = 0; i < children; ++i) {
        Qmx_CorrManagedContainer* child = storage.ReadManagedContainerPtr();
        if (!child || child == this || !seen.insert(child).second)
            QMX_CORR_THROW(InvalidDatabaseFormat, dbName);
        m_containers.push_back(child);
    }
    for (auto* list : {&m_outgoing, &m_incoming}) {
        const unsigned int count = storage.ReadUINT32();
        storage.CheckCount(count, 4);
        list->reserve(count);
        for (unsigned int i = 0; i < count; ++i) {
            Qmx_CorrManagedImplicitRelationship* rel = storage.ReadManagedImpRelPtr();
            if (!rel) QMX_CORR_THROW(InvalidDatabaseFormat, dbName);
            list->push_back(rel);
        }
    }
}

const Qmx_CorrObjectData* Qmx_CorrManagedContainer::GetObjectData() const { return m_data.get(); }

Qmx_CorrObjectData* Qmx_CorrManagedContainer::GetObjectDataForWrite() {
    if (m_data.use_count() != 1) m_data = Qmx_CorrObjectData::CreateObjectData(m_data->GetOwner());
    return m_data.get();
}

Vesk::StringBase<char> Qmx_CorrManagedContainer::GetName() const {
    return GetRepo()->GetString(m_name);
}

bool Qmx_CorrManagedContainer::DbgValidateState() const {
    std::vector<Vesk::StringBase<char>> names;
    for (const Qmx_CorrManagedContainer* child : m_containers) names.push_back(child->GetName());
    if (const Vesk::StringBase<char>* duplicate = FindDuplicate(names)) {
        Vesk_MsgManData::createObject("Quillmark", kSourceFile, __LINE__, kRevision)
            .issueError("Container '%s' has containers with duplicate name (%s).\n",
                        GetName().c_str(), duplicate->c_str());
        return false;
    }
    if (m_itemsLoaded) {
        names.clear();
        for (const Qmx_CorrManagedItem* item : m_items) names.push_back(item->GetName());
        if (const Vesk::StringBase<char>* duplicate = FindDuplicate(names)) {
            Vesk_MsgManData::createObject("Quillmark", kSourceFile, __LINE__, kRevision)
                .issueError("Container '%s' has items with duplicate name (%s).\n",
                            GetName().c_str(), duplicate->c_str());
            return false;
        }
    }
    for (const Qmx_CorrManagedContainer* child : m_containers) {
        if (child->DbgValidateState()) continue;
        Vesk_MsgManData::createObject("Quillmark", kSourceFile, __LINE__, kRevision)
            .issueError("Container '%s' is invalid\n", child->GetName().c_str());
        return false;
    }
    if (m_itemsLoaded) {
        for (const Qmx_CorrManagedItem* item : m_items) {
            if (item->DbgValidateState()) continue;
            Vesk_MsgManData::createObject("Quillmark", kSourceFile, __LINE__, kRevision)
                .issueError("Item '%s' is invalid\n", item->GetName().c_str());
            return false;
        }
    }
    return Qmx_CorrContainer::DbgValidateState();
}

void Qmx_CorrManagedContainer::DbgDump(std::ostream& out, unsigned indent) const {
    const std::string type = Qmx_CorrDbg::GetDumpName(typeid(Qmx_CorrManagedContainer));
    Qmx_CorrDbg::Println(out, indent, "%s: '%s'", type.c_str(), GetName().c_str());
    Qmx_CorrDbg::Println(out, indent, "{");
    Qmx_CorrObject::DbgDump(out, indent + 1);
    if (m_itemsLoaded) {
        Qmx_CorrDbg::Println(out, indent + 1, "Contains %d items",
                             static_cast<int>(m_items.size()));
        for (const Qmx_CorrManagedItem* item : m_items)
            Qmx_CorrDbg::Println(out, indent + 2, "%s", item->GetName().c_str());
    } else {
        Qmx_CorrDbg::Println(out, indent + 1, "Items not currently loaded.");
    }
    Qmx_CorrDbg::Println(out, indent + 1, "Contains %d containers",
                         static_cast<int>(m_containers.size()));
    for (const Qmx_CorrManagedContainer* child : m_containers)
        Qmx_CorrDbg::Println(out, indent + 2, "%s", child->GetName().c_str());
    Qmx_CorrDbg::Println(out, indent, "}");
}

void Qmx_CorrManagedContainer::DbgDump() const { DbgDump(std::cerr, 0); }

Vesk::StringBase<char> Qmx_CorrManagedContainer::GetAbsoluteName() const {
    if (!m_parent) return "/";
    return m_parent->GetAbsoluteName() + GetName() + "/";
}

const Qmx_CorrContainer* Qmx_CorrManagedContainer::GetParent() const { return m_parent; }

Qmx_CorrContainer* Qmx_CorrManagedContainer::GetParent() { return m_parent; }

Qmx_CorrContainer* Qmx_CorrManagedContainer::CreateContainer(const Vesk::StringBase<char>& name) {
    {
        const TempName wanted(GetRepo(), name);
        if (FindChild(wanted.Get()))
            QMX_CORR_THROW(DuplicateObjectFound, GetName().c_str(), name.c_str());
    }
    ReserveOneMore(m_containers, 4);
    auto* child = new Qmx_CorrManagedContainer(name, GetOwner(), this);
    m_containers.push_back(child);
    GetOwner()->SetModified();
    QMX_CORR_TRACE("BUILD", 10, "Created container: " << child->GetAbsoluteName());
    return child;
}

Qmx_CorrItem* Qmx_CorrManagedContainer::CreateItem(const Vesk::StringBase<char>& name) {
    LoadItems();
    const TempName wanted(GetRepo(), name);
    const ItemRange range = FindItems(wanted.Get());
    if (range.first != range.second)
        QMX_CORR_THROW(DuplicateObjectFound, GetName().c_str(), name.c_str());
    return InsertNewItem(range.first, wanted.Get());
}

Qmx_CorrItem* Qmx_CorrManagedContainer::FindOrCreateItem(Qmx_CorrNameHandle name) {
    LoadItems();
    const ItemRange range = FindItems(name);
    if (range.first != range.second) return *range.first;
    return InsertNewItem(range.first, name);
}

Qmx_CorrItem* Qmx_CorrManagedContainer::FindOrCreateItem(const Vesk::StringBase<char>& name) {
    const TempName wanted(GetRepo(), name);
    return FindOrCreateItem(wanted.Get());
}

void Qmx_CorrManagedContainer::Delete(unsigned relMode) {
    if (!m_parent) QMX_CORR_THROW(CannotDeleteTopContainer);
    {
        const FlagRestorer restorer(m_notifyOnRemove);
        m_notifyOnRemove = false;
        DeleteItems(relMode);
        DeleteContainers(relMode);
        DeleteImplicitRelationships();
    }
    if (Qmx_CorrDb* db = GetOwner()->GetDatabase()) db->DeleteStream(m_itemsStreamName);
    GetOwner()->DeleteContainer(this);
    delete this;
}

void Qmx_CorrManagedContainer::DeleteImplicitRelationships() {
    // On copies: each Delete takes the relationship out of these lists. A relationship listed
    // twice, or already gone with another one, is not deleted again.
    for (auto* list : {&m_outgoing, &m_incoming}) {
        const std::vector<Qmx_CorrImplicitRelationship*> copy = *list;
        for (Qmx_CorrImplicitRelationship* rel : copy)
            if (Lists(*list, rel)) rel->Delete();
    }
}

// A child whose Delete throws has not destroyed itself and stays listed; those deleted before
// it leave the list, so that it never holds a destroyed container.
void Qmx_CorrManagedContainer::DeleteContainers(unsigned relMode) {
    const FlagRestorer restorer(m_notifyOnRemove);
    m_notifyOnRemove = false;
    std::size_t deleted = 0;
    try {
        for (; deleted < m_containers.size(); ++deleted) m_containers[deleted]->Delete(relMode);
    } catch (...) {
        m_containers.erase(m_containers.begin(), m_containers.begin() + deleted);
        throw;
    }
    m_containers.clear();
}

void Qmx_CorrManagedContainer::DeleteItems(unsigned relMode) {
    if (relMode > kMaxRelMode) relMode = 0;
    const FlagRestorer restorer(m_notifyOnRemove);
    m_notifyOnRemove = false;
    LoadItems();
    std::size_t deleted = 0;
    try {
        for (; deleted < m_items.size(); ++deleted) m_items[deleted]->Delete(relMode);
    } catch (...) {
        m_items.erase(m_items.begin(), m_items.begin() + deleted);
        m_itemsStreamCurrent = false;
        throw;
    }
    m_items.clear();
    m_itemsStreamCurrent = false;
}

Qmx_CorrContainer* Qmx_CorrManagedContainer::GetContainer(const Vesk::StringBase<char>& name) {
    const TempName wanted(GetRepo(), name);
    return FindChild(wanted.Get());
}

Qmx_CorrItem* Qmx_CorrManagedContainer::GetItem(const Vesk::StringBase<char>& name) {
    LoadItems();
    const TempName wanted(GetRepo(), name);
    const ItemRange range = FindItems(wanted.Get());
    return range.first != range.second ? *range.first : nullptr;
}

const std::vector<Qmx_CorrManagedItem*>& Qmx_CorrManagedContainer::GetItems() const {
    LoadItems();
    return m_items;
}

std::vector<Qmx_CorrManagedItem*>& Qmx_CorrManagedContainer::GetItems() {
    LoadItems();
    return m_items;
}

const std::vector<Qmx_CorrManagedContainer*>& Qmx_CorrManagedContainer::GetContainers() const {
    return m_containers;
}

std::vector<Qmx_CorrManagedContainer*>& Qmx_CorrManagedContainer::GetContainers() {
    return m_containers;
}

const std::vector<Qmx_CorrImplicitRelationship*>&
Qmx_CorrManagedContainer::GetOutgoingRelationships() const {
    return m_outgoing;
}

std::vector<Qmx_CorrImplicitRelationship*>& Qmx_CorrManagedContainer::GetOutgoingRelationships() {
    return m_outgoing;
}

const std::vector<Qmx_CorrImplicitRelationship*>&
Qmx_CorrManagedContainer::GetIncomingRelationships() const {
    return m_incoming;
}

std::vector<Qmx_CorrImplicitRelationship*>& Qmx_CorrManagedContainer::GetIncomingRelationships() {
    return m_incoming;
}

void Qmx_CorrManagedContainer::MoveUp() {
    if (!m_parent || !m_parent->m_parent) QMX_CORR_THROW(InvalidRequest);
    Qmx_CorrManagedContainer* const grandparent = m_parent->m_parent;
    if (grandparent->FindChild(m_name)) QMX_CORR_THROW(InvalidRequest);
    // Room first, so that nothing can fail once the container has left its parent; the
    // parent's list is changed directly, as its notify flag may be off during a deletion.
    ReserveOneMore(grandparent->m_containers, 4);
    EraseFirst(m_parent->m_containers, this);
    m_parent = grandparent;
    grandparent->m_containers.push_back(this);
    GetOwner()->SetModified();
}

Qmx_CorrItem* Qmx_CorrManagedContainer::RenameItem(const Vesk::StringBase<char>& oldName,
                                                   const Vesk::StringBase<char>& newName) {
    LoadItems();
    // The self-checks only talk to the debug output; without it they would cost a scan of
    // the list for nothing.
    const bool selfCheck = Vesk_MsgManData::IsDebugOutputOn();
    if (selfCheck) CheckItemOrder("RI");
    const TempName oldHandle(GetRepo(), oldName);
    const TempName newHandle(GetRepo(), newName);
    const ItemRange found = FindItems(oldHandle.Get());
    if (found.first == found.second) return nullptr;
    Qmx_CorrManagedItem* const item = *found.first;
    if (item->GetName() != oldName) {
        Vesk_MsgManData::debugStub("eek, itemname %s != oldname %s\n", item->GetName().c_str(),
                                   oldName.c_str());
    }
    const ItemRange taken = FindItems(newHandle.Get());
    if (taken.first != taken.second)
        QMX_CORR_THROW(DuplicateObjectFound, GetName().c_str(), newName.c_str());
    m_items.erase(found.first);
    if (selfCheck) CheckItemOrder("BAD");
    item->SetName(newName);
    // The list has just lost an entry, so the insertion cannot reallocate.
    m_items.insert(FindItems(item->GetNameHandle()).first, item);
    m_itemsStreamCurrent = false;
    GetOwner()->SetModified();
    if (selfCheck) {
        CheckItemOrder("RenameItem done");
        CheckRenamed(item, oldName, newName);
    }
    return item;
}

void Qmx_CorrManagedContainer::CheckRenamed(const Qmx_CorrManagedItem* item,
                                            const Vesk::StringBase<char>& oldName,
                                            const Vesk::StringBase<char>& newName) const {
    const TempName oldHandle(GetRepo(), oldName);
    const TempName newHandle(GetRepo(), newName);
    const ItemRange old = FindItems(oldHandle.Get());
    if (old.first != old.second)
        Vesk_MsgManData::debugStub("eek, oldname %s still has item\n", oldName.c_str());
    const ItemRange renamed = FindItems(newHandle.Get());
    if (renamed.first == renamed.second) {
        Vesk_MsgManData::debugStub("eek, can't find renamed item %s\n", newName.c_str());
    } else if (*renamed.first != item) {
        Vesk_MsgManData::debugStub("eek, renamed item diff %s\n", newName.c_str());
    } else {
        Vesk_MsgManData::debugStub("renamed worked %s %s\n", oldName.c_str(), newName.c_str());
    }
}

bool Qmx_CorrManagedContainer::CheckItemOrder(const char* label) const {
    bool sorted = true;
    for (std::size_t i = 1; i < m_items.size(); ++i) {
        const Qmx_CorrManagedItem* previous = m_items[i - 1];
        const Qmx_CorrManagedItem* current = m_items[i];
        if (GetRepo()->IsLess(previous->GetNameHandle(), current->GetNameHandle())) continue;
        Vesk_MsgManData::debugStub("eek, ITEM NOT SORTED %s %s %s\n", label,
                                   previous->GetName().c_str(), current->GetName().c_str());
        sorted = false;
    }
    return sorted;
}

bool Qmx_CorrManagedContainer::NameMatches(Qmx_CorrNameHandle name) const {
    return GetRepo()->IsEqual(name, m_name);
}

void Qmx_CorrManagedContainer::AddOutgoingRelationship(Qmx_CorrImplicitRelationship* rel) {
    m_outgoing.push_back(rel);
}

void Qmx_CorrManagedContainer::AddIncomingRelationship(Qmx_CorrImplicitRelationship* rel) {
    m_incoming.push_back(rel);
}

void Qmx_CorrManagedContainer::RemoveOutgoingRelationship(Qmx_CorrImplicitRelationship* rel) {
    EraseFirst(m_outgoing, rel);
}

void Qmx_CorrManagedContainer::RemoveIncomingRelationship(Qmx_CorrImplicitRelationship* rel) {
    EraseFirst(m_incoming, rel);
}

void Qmx_CorrManagedContainer::NotifyContainerRemoved(Qmx_CorrManagedContainer* child) {
    if (m_notifyOnRemove) EraseFirst(m_containers, child);
}

void Qmx_CorrManagedContainer::NotifyItemRemoved(Qmx_CorrManagedItem* item) {
    if (!m_notifyOnRemove) return;
    LoadItems();
    const ItemRange range = FindItems(item->GetNameHandle());
    const auto found = std::find(range.first, range.second, item);
    if (found == range.second) return;
    m_items.erase(found);
    m_itemsStreamCurrent = false;
}

void Qmx_CorrManagedContainer::Archive(Qmx_CorrStorage& storage) const {
    storage.GetData().containerVersion = Qmx_CorrStorageData::kContainerVersion;
    Qmx_CorrObjectData::ArchiveObjectData(storage, m_data);
    storage.WriteContainerPtr(m_parent);
    GetRepo()->ArchiveName(storage, m_name);
    storage.WriteString(m_itemsStreamName);
    storage.WriteUINT32(m_containerId);
    storage.WriteUINT32(static_cast<unsigned int>(m_containers.size()));
    for (Qmx_CorrManagedContainer* child : m_containers) storage.WriteContainerPtr(child);
    for (const auto* list : {&m_outgoing, &m_incoming}) {
        storage.WriteUINT32(static_cast<unsigned int>(list->size()));
        for (Qmx_CorrImplicitRelationship* rel : *list)
            storage.WriteImpRelPtr(static_cast<Qmx_CorrManagedImplicitRelationship*>(rel));
    }
    if (!m_itemsStreamCurrent && GetOwner()->GetDatabase()) WriteItemsStream();
}

void Qmx_CorrManagedContainer::Flush(bool flushPools) const {
    if (!m_itemsLoaded || !GetOwner()->GetDatabase()) return;
    QMX_CORR_TRACE("POOL", 10, "Flushing out items for container '" << GetAbsoluteName() << "'");
    if (!m_itemsStreamCurrent) WriteItemsStream();
    if (flushPools) {
        if (Qmx_CorrManagedItemMgr* itemMgr = GetOwner()->GetManagedItemMgr())
            itemMgr->FlushPools(m_containerId, true);
    }
    std::vector<Qmx_CorrManagedItem*>().swap(m_items);
    m_itemsLoaded = false;
}

void Qmx_CorrManagedContainer::FlushAll(bool flushPools) const {
    Flush(flushPools);
    for (const Qmx_CorrManagedContainer* child : m_containers) child->FlushAll(flushPools);
}

Qmx_CorrNameRepository* Qmx_CorrManagedContainer::GetRepo() const {
    return GetOwner()->GetNameRepo();
}

Qmx_CorrManagedContainer* Qmx_CorrManagedContainer::FindChild(Qmx_CorrNameHandle name) const {
    for (Qmx_CorrManagedContainer* child : m_containers)
        if (child->NameMatches(name)) return child;
    return nullptr;
}

Qmx_CorrManagedContainer::ItemRange Qmx_CorrManagedContainer::FindItems(
    Qmx_CorrNameHandle name) const {
    return std::equal_range(m_items.begin(), m_items.end(), name, ItemLess{GetRepo()});
}

void Qmx_CorrManagedContainer::LoadItems() const {
    if (m_itemsLoaded) return;
    QMX_CORR_TRACE("POOL", 10,
                   "Performing delayed loading of items for container "
                       << GetAbsoluteName() << " (ID: " << m_itemsStreamName << ")");
    Qmx_CorrDb* const db = GetOwner()->GetDatabase();
    if (!db) return;
    Qmx_CorrStream* const stream = db->OpenStream(m_itemsStreamName, kItemsReadMode);
    if (!stream) return;
    const Qmx_CorrStreamCloser closer(db, stream);
    ReadItemsStream(*stream, db->GetName());
    m_itemsStreamCurrent = true;
    m_itemsLoaded = true;
}

// The list is built aside and taken only when the whole stream has proved sound. The count
// must match the bytes left exactly and is checked before anything is reserved; a stream that
// cannot tell its length is read without reserving: a short one throws at its end, and one
// with bytes after the last handle is refused too.
void Qmx_CorrManagedContainer::ReadItemsStream(Qmx_CorrStream& stream,
                                               const Vesk::StringBase<char>& dbName) const {
    const unsigned int count = stream.ReadUINT32();
    const std::int64_t left = stream.BytesLeft();
    if (left >= 0 && static_cast<std::uint64_t>(left) != std::uint64_t{count} * kHandleSize)
        QMX_CORR_THROW(InvalidDatabaseFormat, dbName.c_str());
    std::vector<Qmx_CorrManagedItem*> items;
    if (left >= 0) items.reserve(count);
    for (unsigned int i = 0; i < count; ++i) {
        char bytes[kHandleSize];
        stream.read(bytes, kHandleSize);
        Qmx_CorrManagedItem* item = GetOwner()->GetItemPtr(Vesk_Endian::DecodeUINT32LE(bytes));
        // The binary searches rely on strictly ascending names, and every item must be this
        // container's: a foreign one would be deleted or renamed through the wrong list.
        if (!item || item->GetParent() != this ||
            (!items.empty() &&
             !GetRepo()->IsLess(items.back()->GetNameHandle(), item->GetNameHandle()))) {
            QMX_CORR_THROW(InvalidDatabaseFormat, dbName.c_str());
        }
        items.push_back(item);
    }
    if (left < 0 && stream.HasMoreBytes()) QMX_CORR_THROW(InvalidDatabaseFormat, dbName.c_str());
    m_items.swap(items);
}

void Qmx_CorrManagedContainer::WriteItemsStream() const {
    Qmx_CorrDb* const db = GetOwner()->GetDatabase();
    Qmx_CorrStream* const stream = db->OpenStream(m_itemsStreamName, kItemsWriteMode);
    if (!stream) QMX_CORR_THROW(CannotWriteDatabase, m_itemsStreamName.c_str());
    const Qmx_CorrStreamCloser closer(db, stream);
    std::string handles(m_items.size() * kHandleSize, '\0');
    for (std::size_t i = 0; i < m_items.size(); ++i)
        Vesk_Endian::EncodeUINT32LE(GetOwner()->GetItemHandle(m_items[i]),
                                    &handles[i * kHandleSize]);
    stream->WriteUINT32(static_cast<unsigned int>(m_items.size()));
    stream->write(handles.data(), static_cast<unsigned int>(handles.size()));
    m_itemsStreamCurrent = true;
}

Qmx_CorrItem* Qmx_CorrManagedContainer::InsertNewItem(ItemIterator at, Qmx_CorrNameHandle name) {
    const std::ptrdiff_t position = at - m_items.begin();
    // Room first, the first item reserving for a pool's worth: once the item is made,
    // inserting it cannot fail.
    if (m_items.empty() && m_items.capacity() < kFirstItemReserve)
        m_items.reserve(kFirstItemReserve);
    else
        ReserveOneMore(m_items, kFirstItemReserve);
    Qmx_CorrManagedItem* const item = GetOwner()->CreateManagedItem(name, this, m_containerId);
    if (!item) return nullptr;
    m_items.insert(m_items.begin() + position, item);
    m_itemsStreamCurrent = false;
    GetOwner()->SetModified();
    QMX_CORR_TRACE("BUILD", 10, "Created item: " << item->GetAbsoluteName());
    return item;
}
