#include "Qmx_CorrArchive.h"

#include <algorithm>
#include <new>
#include <unordered_map>
#include <vector>

#include "Qmx_CorrDb_Internal.h"
#include "Qmx_CorrDbg.h"
#include "Qmx_CorrException.h"
#include "Qmx_CorrItemDataMgr.h"
#include "Qmx_CorrItemRelOverflowMgr.h"
#include "Qmx_CorrManagedContainer.h"
#include "Qmx_CorrManagedExpRelMgr.h"
#include "Qmx_CorrManagedImplicitRelationship.h"
#include "Qmx_CorrManagedItemMgr.h"
#include "Qmx_CorrNameRepository.h"
#include "Qmx_CorrObjectOwner.h"
#include "Qmx_CorrRelDataMgr.h"
#include "Qmx_CorrRelItemOverflowMgr.h"
#include "Qmx_CorrStorage.h"
#include "Qmx_CorrStream.h"
#include "Qmx_CorrStreamCloser.h"
#include "Vesk_File.h"

namespace {
const char* const kSourceFile = "s/Qmx_CorrArchive";
const char* const kRevision = "1";

const char* const kIdentifier = "Qmx_Corr_Archive";
const unsigned int kFormatVersion = 1;
const char* const kInfo = "info";
const char* const kItemData = "shared_item_data";
const char* const kRelData = "shared_rel_data";
const char* const kItemRelOverflow = "item_rel_overflow";
const char* const kRelItemOverflow = "rel_item_overflow";
const char* const kContainers = "containers";
const char* const kImpRels = "irels";
const int kReadMode = Qmx_CorrDb::kRead;
const int kWriteMode = Qmx_CorrDb::kWrite | Qmx_CorrDb::kTruncate;

// The fewest bytes a record can take: a damaged table size is compared with the stream before
// any memory is set aside for it. A container: private flag, parent, name record, an empty
// stream name, id and three counts; an implicit relationship: data index, two containers, two
// flags and the direction.
const unsigned int kMinContainerRecord = 1 + 4 + 8 + 4 + 4 + 12;
const unsigned int kMinImpRelRecord = 4 + 4 + 4 + 1 + 4 + 1;

}  // namespace

Qmx_CorrArchive::Qmx_CorrArchive(const Vesk::StringBase<char>& dbName,
                                 const Vesk::StringBase<char>& tempDir,
                                 Qmx_CorrManagedItemMgr* itemMgr,
                                 Qmx_CorrManagedExpRelMgr* expRelMgr,
                                 Qmx_CorrItemRelOverflowMgr* itemRelOverflow,
                                 Qmx_CorrRelItemOverflowMgr* relItemOverflow,
                                 Qmx_CorrObjectOwner* owner)
    : m_topContainerOrdinal(0),
      m_itemMgr(itemMgr),
      m_expRelMgr(expRelMgr),
      m_owner(owner),
      m_constructedContainers(0),
      m_constructedImpRels(0) {
    QMX_CORR_TRACE("ARCHIVE", 10, "Opening archive '" << dbName << "' for reading");
    OpenDatabase(dbName, tempDir);
    m_storageData.containers.clear();
    m_storageData.implicitRelationships.clear();
    m_storageData.itemSwizzler = m_itemMgr->GetNewSwizzler();
    m_storageData.expRelSwizzler = m_expRelMgr->GetNewSwizzler();
    try {
        ReadInfo();
        RestoreManagers(itemRelOverflow, relItemOverflow);
        RestoreContainers();
        RestoreImplicitRelationships();
        CheckGraph();
    } catch (...) {
        DiscardRestored();
        m_expRelMgr->CloseDb();
        m_itemMgr->CloseDb();
        delete m_storageData.itemSwizzler;
        delete m_storageData.expRelSwizzler;
        CloseDatabase();
        throw;
    }
}

// In a directory of the host's the database still gets a fresh directory of its own, so that
// two databases never unpack into the same one.
void Qmx_CorrArchive::OpenDatabase(const Vesk::StringBase<char>& dbName,
                                   const Vesk::StringBase<char>& tempDir) {
    if (tempDir.empty()) {
        m_db.reset(new Qmx_CorrDb_Internal(dbName));
        return;
    }
    if (!Vesk::File::mkdir(tempDir, true)) QMX_CORR_THROW(CannotWriteDatabase, dbName.c_str());
    m_ownTempDir = Vesk::File::tmpnam(tempDir.c_str());
    if (m_ownTempDir.empty()) QMX_CORR_THROW(CannotWriteDatabase, dbName.c_str());
    try {
        m_db.reset(new Qmx_CorrDb_Internal(dbName, m_ownTempDir));
    } catch (...) {
        CloseDatabase();
        throw;
    }
}

void Qmx_CorrArchive::CloseDatabase() {
    m_db.reset();
    if (!m_ownTempDir.empty()) Vesk::File::remove_r(m_ownTempDir);
    m_ownTempDir.clear();
}

Qmx_CorrArchive::~Qmx_CorrArchive() {
    m_expRelMgr->CloseDb();
    m_itemMgr->CloseDb();
    delete m_storageData.itemSwizzler;
    delete m_storageData.expRelSwizzler;
    CloseDatabase();
}

Qmx_CorrManagedContainer* Qmx_CorrArchive::GetTopContainer() const {
    if (m_storageData.containers.empty()) return nullptr;
    return m_storageData.containers[m_topContainerOrdinal];
}

unsigned int Qmx_CorrArchive::GetNumImplicitRelationships() const {
    return static_cast<unsigned int>(m_storageData.implicitRelationships.size());
}

Qmx_CorrManagedImplicitRelationship* Qmx_CorrArchive::GetImplicitRelationship(
    unsigned int index) const {
    return index < m_storageData.implicitRelationships.size()
               ? m_storageData.implicitRelationships[index]
               : nullptr;
}

// Every ordinal must resolve to the final address of its object before the first record that
// names it is read, so the tables are filled with raw memory that the restore constructs in.
void Qmx_CorrArchive::ReadInfo() {
    QMX_CORR_TRACE("ARCHIVE", 10, "Reading archive info from " << kInfo << " stream.");
    Qmx_CorrStreamCloser info(m_db.get(), m_db->OpenStream(kInfo, kReadMode));
    if (!info.Get()) return;
    const Vesk::StringBase<char> dbName = m_db->GetName();
    Qmx_CorrStorage storage(dbName, info.Get(), m_storageData);
    if (storage.ReadString() != kIdentifier || storage.ReadUINT32() != kFormatVersion)
        QMX_CORR_THROW(InvalidDatabaseFormat, dbName.c_str());
    const unsigned int containerCount = storage.ReadUINT32();
    const unsigned int impRelCount = storage.ReadUINT32();
    CheckTableSize(containerCount, kContainers, kMinContainerRecord, 2);
    CheckTableSize(impRelCount, kImpRels, kMinImpRelRecord, 1);
    m_storageData.containerVersion = storage.ReadUINT32();
    m_storageData.itemVersion = storage.ReadUINT32();
    m_storageData.expRelVersion = storage.ReadUINT32();
    m_storageData.impRelVersion = storage.ReadUINT32();
    m_storageData.objectDataVersion = storage.ReadUINT32();
    m_topContainerOrdinal = storage.ReadUINT32();
    const unsigned int nextContainerId = storage.ReadUINT32();
    // Bytes after the last field mean the header was written by something else.
    if (m_topContainerOrdinal == 0 || m_topContainerOrdinal >= containerCount ||
        storage.BytesLeft() > 0)
        QMX_CORR_THROW(InvalidDatabaseFormat, dbName.c_str());
    PrepareTable(m_storageData.containers, containerCount);
    QMX_CORR_TRACE("ARCHIVE", 10, "Initializing memory for " << containerCount << " containers");
    PrepareTable(m_storageData.implicitRelationships, impRelCount);
    QMX_CORR_TRACE("ARCHIVE", 10,
                   "Initializing memory for " << impRelCount << " implicit relationships");
    m_owner->SetNextContainerId(nextContainerId);
}

// A table of `size` entries (the null entry included, at least `least`) must fit records of at
// least `minRecord` bytes in `streamName`; a database that announces records but lacks their
// stream is refused too.
void Qmx_CorrArchive::CheckTableSize(unsigned int size, const char* streamName,
                                     unsigned int minRecord, unsigned int least) const {
    const Vesk::StringBase<char> dbName = m_db->GetName();
    if (size < least) QMX_CORR_THROW(InvalidDatabaseFormat, dbName.c_str());
    if (size == 1) return;
    Qmx_CorrStreamCloser stream(m_db.get(), m_db->OpenStream(streamName, kReadMode));
    if (!stream.Get()) QMX_CORR_THROW(CannotReadDatabase, dbName.c_str());
    const std::int64_t bytes = stream.Get()->BytesLeft();
    if (bytes >= 0 &&
        static_cast<std::uint64_t>(size - 1) * minRecord > static_cast<std::uint64_t>(bytes))
        QMX_CORR_THROW(InvalidDatabaseFormat, dbName.c_str());
}

template <class T>
void Qmx_CorrArchive::PrepareTable(std::vector<T*>& table, unsigned int size) {
    table.assign(1, nullptr);
    table.reserve(size);
    for (unsigned int i = 1; i < size; ++i)
        table.push_back(static_cast<T*>(::operator new(sizeof(T))));
}

void Qmx_CorrArchive::RestoreManagers(Qmx_CorrItemRelOverflowMgr* itemRelOverflow,
                                      Qmx_CorrRelItemOverflowMgr* relItemOverflow) {
    QMX_CORR_TRACE("ARCHIVE", 10, "Restoring the name repository from archive.");
    m_owner->GetNameRepo()->Restore(m_db.get());
    RestoreStream(kItemData, "Restoring the shared item data from the ",
                  [this](Qmx_CorrStorage& s) { m_owner->GetItemDataMgr()->Restore(s); });
    RestoreStream(kRelData, "Restoring the shared relationship data from the ",
                  [this](Qmx_CorrStorage& s) { m_owner->GetRelDataMgr()->Restore(s); });
    if (itemRelOverflow)
        RestoreStream(kItemRelOverflow, "Restoring the item->relationship overflow data from the ",
                      [itemRelOverflow](Qmx_CorrStorage& s) { itemRelOverflow->Restore(s); });
    if (relItemOverflow)
        RestoreStream(kRelItemOverflow, "Restoring the relationship->item overflow data from the ",
                      [relItemOverflow](Qmx_CorrStorage& s) { relItemOverflow->Restore(s); });
    QMX_CORR_TRACE("ARCHIVE", 10, "Restoring the explicit relationships data from archive.");
    m_expRelMgr->OpenDb(m_db.get(), m_storageData, m_owner);
    QMX_CORR_TRACE("ARCHIVE", 10, "Restoring the item data from archive.");
    m_itemMgr->OpenDb(m_db.get(), m_storageData, m_owner);
}

template <class Reader>
void Qmx_CorrArchive::RestoreStream(const char* name, const char* trace, Reader read) {
    Qmx_CorrStreamCloser stream(m_db.get(), m_db->OpenStream(name, kReadMode));
    if (!stream.Get()) return;
    QMX_CORR_TRACE("ARCHIVE", 10, trace << name << " stream.");
    const Vesk::StringBase<char> dbName = m_db->GetName();
    Qmx_CorrStorage storage(dbName, stream.Get(), m_storageData);
    try {
        read(storage);
    } catch (const Qmx_CorrException::IncorrectPropertyType&) {
        // A stored property tag that is neither type is damage, not a caller's mistake.
        QMX_CORR_THROW(InvalidDatabaseFormat, dbName.c_str());
    }
    // Spare bytes mean a count was damaged and records would silently be missing.
    if (storage.BytesLeft() > 0) QMX_CORR_THROW(InvalidDatabaseFormat, dbName.c_str());
}

void Qmx_CorrArchive::RestoreContainers() {
    QMX_CORR_TRACE("ARCHIVE", 10,
                   "Restoring the container data from the " << kContainers << " stream.");
    RestoreTable(m_storageData.containers, kContainers, m_constructedContainers);
}

void Qmx_CorrArchive::RestoreImplicitRelationships() {
    QMX_CORR_TRACE("ARCHIVE", 10,
                   "Restoring the implicit data from the " << kImpRels << " stream.");
    RestoreTable(m_storageData.implicitRelationships, kImpRels, m_constructedImpRels);
}

// Constructs every entry from its record in the table's memory; any failure is reported as a
// database that cannot be read. `constructed` counts the entries done, for DiscardRestored.
template <class T>
void Qmx_CorrArchive::RestoreTable(std::vector<T*>& table, const char* name,
                                   std::size_t& constructed) {
    if (table.size() <= 1) return;
    const Vesk::StringBase<char> dbName = m_db->GetName();
    Qmx_CorrStreamCloser stream(m_db.get(), m_db->OpenStream(name, kReadMode));
    if (!stream.Get()) QMX_CORR_THROW(CannotReadDatabase, dbName.c_str());
    Qmx_CorrStorage storage(dbName, stream.Get(), m_storageData);
    try {
        for (std::size_t i = 1; i < table.size(); ++i) {
            new (table[i]) T(storage, m_owner);
            constructed = i;
        }
    } catch (const std::bad_alloc&) {
        throw;
    } catch (...) {
        QMX_CORR_THROW(CannotReadDatabase, dbName.c_str());
    }
    // Records beyond the table: the table size or a record was damaged.
    if (storage.BytesLeft() > 0) QMX_CORR_THROW(CannotReadDatabase, dbName.c_str());
}

// The restored records must form one tree under the top container, every container listed
// by exactly its parent, and every implicit relationship listed by exactly its two containers;
// otherwise the objects would be destroyed twice or never, or outlive what they name.
void Qmx_CorrArchive::CheckGraph() const {
    const auto& containers = m_storageData.containers;
    if (containers.empty()) return;
    const Vesk::StringBase<char> dbName = m_db->GetName();
    std::unordered_map<const Qmx_CorrContainer*, unsigned int> listedAsChild;
    std::unordered_map<const Qmx_CorrImplicitRelationship*, unsigned int> listedOut, listedIn;
    for (std::size_t i = 1; i < containers.size(); ++i) {
        const Qmx_CorrManagedContainer* container = containers[i];
        for (const Qmx_CorrManagedContainer* child : container->GetContainers()) {
            if (!child || child->GetParent() != container || ++listedAsChild[child] > 1)
                QMX_CORR_THROW(CannotReadDatabase, dbName.c_str());
        }
        for (const Qmx_CorrImplicitRelationship* rel : container->GetOutgoingRelationships()) {
            if (!rel || rel->GetSrcContainer() != container || ++listedOut[rel] > 1)
                QMX_CORR_THROW(CannotReadDatabase, dbName.c_str());
        }
        for (const Qmx_CorrImplicitRelationship* rel : container->GetIncomingRelationships()) {
            if (!rel || rel->GetDstContainer() != container || ++listedIn[rel] > 1)
                QMX_CORR_THROW(CannotReadDatabase, dbName.c_str());
        }
    }
    for (std::size_t i = 1; i < containers.size(); ++i) {
        // Every committed container writes its items stream; without it the container's
        // items could not be found, nor deleted with it.
        if (!m_db->StreamExists(containers[i]->GetItemsStreamName()))
            QMX_CORR_THROW(CannotReadDatabase, dbName.c_str());
    }
    const Qmx_CorrManagedContainer* top = GetTopContainer();
    if (top->GetParent() || listedAsChild.count(top) != 0 ||
        listedAsChild.size() != containers.size() - 2 || CountTree(top) != containers.size() - 1)
        QMX_CORR_THROW(CannotReadDatabase, dbName.c_str());
    const auto& rels = m_storageData.implicitRelationships;
    if (listedOut.size() != rels.size() - 1 || listedIn.size() != rels.size() - 1)
        QMX_CORR_THROW(CannotReadDatabase, dbName.c_str());
}

// The containers reachable from `top`, each counted once; a cycle cannot be reached from the
// top, so the count stays short of the table.
std::size_t Qmx_CorrArchive::CountTree(const Qmx_CorrManagedContainer* top) {
    std::size_t count = 0;
    std::vector<const Qmx_CorrManagedContainer*> pending{top};
    while (!pending.empty()) {
        const Qmx_CorrManagedContainer* container = pending.back();
        pending.pop_back();
        ++count;
        for (const Qmx_CorrManagedContainer* child : container->GetContainers())
            pending.push_back(child);
    }
    return count;
}

// After a failed restore: destroys what was constructed, one object at a time (a container
// must not destroy children that may be raw memory), and frees the rest.
void Qmx_CorrArchive::DiscardRestored() {
    auto& containers = m_storageData.containers;
    for (std::size_t i = 1; i <= m_constructedContainers; ++i)
        containers[i]->GetContainers().clear();
    for (std::size_t i = 1; i < containers.size(); ++i) {
        if (i <= m_constructedContainers)
            delete containers[i];
        else
            ::operator delete(containers[i]);
    }
    auto& rels = m_storageData.implicitRelationships;
    for (std::size_t i = 1; i < rels.size(); ++i) {
        if (i <= m_constructedImpRels)
            delete rels[i];
        else
            ::operator delete(rels[i]);
    }
    containers.clear();
    rels.clear();
}

void Qmx_CorrArchive::Commit(const Qmx_CorrNameRepository* repo,
                             const Qmx_CorrItemDataMgr* itemData, const Qmx_CorrRelDataMgr* relData,
                             const Qmx_CorrItemRelOverflowMgr* itemRelOverflow,
                             const Qmx_CorrRelItemOverflowMgr* relItemOverflow,
                             const Qmx_CorrManagedContainer* top,
                             const Qmx_CorrObjectOwner* owner) {
    if (!top) return;
    RebuildTables(top);
    if (repo) repo->Archive(m_db.get());
    WriteStream(kItemData, [itemData](Qmx_CorrStorage& s) { itemData->Archive(s); });
    WriteStream(kRelData, [relData](Qmx_CorrStorage& s) { relData->Archive(s); });
    WriteRecords(kContainers, m_storageData.containers);
    WriteRecords(kImpRels, m_storageData.implicitRelationships);
    m_expRelMgr->Commit();
    m_itemMgr->Commit();
    if (itemRelOverflow)
        WriteStream(kItemRelOverflow,
                    [itemRelOverflow](Qmx_CorrStorage& s) { itemRelOverflow->Archive(s); });
    if (relItemOverflow)
        WriteStream(kRelItemOverflow,
                    [relItemOverflow](Qmx_CorrStorage& s) { relItemOverflow->Archive(s); });
    WriteInfo(owner);
    m_db->Commit();
}

// Both tables sorted by address, null entry first, so that WriteContainerPtr and
// WriteImpRelPtr find every object by binary search and records agree with stream order.
void Qmx_CorrArchive::RebuildTables(const Qmx_CorrManagedContainer* top) {
    auto& containers = m_storageData.containers;
    auto& rels = m_storageData.implicitRelationships;
    containers.assign(1, nullptr);
    rels.assign(1, nullptr);
    std::vector<const Qmx_CorrManagedContainer*> pending{top};
    while (!pending.empty()) {
        const Qmx_CorrManagedContainer* container = pending.back();
        pending.pop_back();
        containers.push_back(const_cast<Qmx_CorrManagedContainer*>(container));
        for (const auto* list :
             {&container->GetOutgoingRelationships(), &container->GetIncomingRelationships()})
            for (Qmx_CorrImplicitRelationship* rel : *list)
                rels.push_back(static_cast<Qmx_CorrManagedImplicitRelationship*>(rel));
        for (const Qmx_CorrManagedContainer* child : container->GetContainers())
            pending.push_back(child);
    }
    SortUnique(containers);
    SortUnique(rels);
    m_topContainerOrdinal =
        static_cast<unsigned int>(std::lower_bound(containers.begin() + 1, containers.end(), top,
                                                   std::less<const Qmx_CorrManagedContainer*>()) -
                                  containers.begin());
}

template <class T>
void Qmx_CorrArchive::SortUnique(std::vector<T*>& table) {
    std::sort(table.begin() + 1, table.end(), std::less<T*>());
    table.erase(std::unique(table.begin() + 1, table.end()), table.end());
}

template <class Writer>
void Qmx_CorrArchive::WriteStream(const char* name, Writer write) {
    const Vesk::StringBase<char> dbName = m_db->GetName();
    Qmx_CorrStreamCloser stream(m_db.get(), m_db->OpenStream(name, kWriteMode));
    if (!stream.Get()) QMX_CORR_THROW(CannotWriteDatabase, dbName.c_str());
    Qmx_CorrStorage storage(dbName, stream.Get(), m_storageData);
    write(storage);
}

template <class T>
void Qmx_CorrArchive::WriteRecords(const char* name, const std::vector<T*>& table) {
    const Vesk::StringBase<char> dbName = m_db->GetName();
    Qmx_CorrStreamCloser stream(m_db.get(), m_db->OpenStream(name, kWriteMode));
    if (!stream.Get()) QMX_CORR_THROW(CannotWriteDatabase, dbName.c_str());
    Qmx_CorrStorage storage(dbName, stream.Get(), m_storageData);
    try {
        for (std::size_t i = 1; i < table.size(); ++i) table[i]->Archive(storage);
    } catch (const std::bad_alloc&) {
        throw;
    } catch (...) {
        QMX_CORR_THROW(CannotWriteDatabase, dbName.c_str());
    }
}

void Qmx_CorrArchive::WriteInfo(const Qmx_CorrObjectOwner* owner) {
    const Qmx_CorrStorageData& data = m_storageData;
    WriteStream(kInfo, [&data, this, owner](Qmx_CorrStorage& s) {
        s.WriteString(kIdentifier);
        s.WriteUINT32(kFormatVersion);
        s.WriteUINT32(static_cast<unsigned int>(data.containers.size()));
        s.WriteUINT32(static_cast<unsigned int>(data.implicitRelationships.size()));
        for (unsigned int version : {data.containerVersion, data.itemVersion, data.expRelVersion,
                                     data.impRelVersion, data.objectDataVersion})
            s.WriteUINT32(version);
        s.WriteUINT32(m_topContainerOrdinal);
        s.WriteUINT32(owner->GetLastContainerId());
    });
}
