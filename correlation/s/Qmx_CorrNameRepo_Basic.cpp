#include "Qmx_CorrNameRepo_Basic.h"

#include <algorithm>
#include <cassert>
#include <cstdint>
#include <typeinfo>

#include "Qmx_CorrDb.h"
#include "Qmx_CorrDbg.h"
#include "Qmx_CorrException.h"
#include "Qmx_CorrName_Basic.h"
#include "Qmx_CorrStorage.h"
#include "Qmx_CorrStream.h"

namespace {

constexpr const char* kSourceFile = "s/Qmx_CorrNameRepo_Basic";
constexpr const char* kRevision = "1";
constexpr const char* kTraceCategory = "STRING_ARCHIVE";
constexpr unsigned kTraceLevel = 10;
// Even an empty string takes its 4-byte length.
constexpr std::int64_t kMinStringBytes = 4;

// Every comparison of names passes here, so the exact type is compared rather than searched
// for with dynamic_cast; the record class is final, so the answers are the same.
Qmx_CorrName_Basic* AsBasic(Qmx_CorrNameHandle name) {
    Qmx_CorrName* record = name.GetRecord();
    if (!record || typeid(*record) != typeid(Qmx_CorrName_Basic)) return nullptr;
    return static_cast<Qmx_CorrName_Basic*>(record);
}

// The lowest empty slot above slot 0 from `from` on, or 0 when there is none.
unsigned int FindEmptySlot(const std::vector<Vesk::StringBase<char>>& table, std::size_t from) {
    for (std::size_t i = std::max<std::size_t>(from, 1); i < table.size(); ++i) {
        if (table[i].empty()) return static_cast<unsigned int>(i);
    }
    return 0;
}

// Whether the stored first free slot and free count describe `table`, as the writer keeps
// them: the count of empty slots, and the lowest of them (0 when there is none).
bool CountersAgree(const std::vector<Vesk::StringBase<char>>& table, unsigned int firstFreeSlot,
                   unsigned int freeCount) {
    const auto empty = std::count_if(table.begin() + 1, table.end(),
                                     [](const Vesk::StringBase<char>& s) { return s.empty(); });
    if (static_cast<std::uint64_t>(empty) != freeCount) return false;
    return firstFreeSlot == FindEmptySlot(table, 1);
}

}  // namespace

Qmx_CorrNameRepo_Basic::Qmx_CorrNameRepo_Basic()
    : m_nullRecord(new Qmx_CorrName_Basic(this, 0, 0, 0)),
      m_table(1),
      m_firstFreeSlot(0),
      m_freeCount(0) {}

Qmx_CorrNameRepo_Basic::~Qmx_CorrNameRepo_Basic() { delete m_nullRecord; }

void Qmx_CorrNameRepo_Basic::Archive(Qmx_CorrDb* db) const {
    Qmx_CorrStream* stream = db->OpenStream(kStreamName, kArchiveMode);
    if (!stream) QMX_CORR_THROW(CannotWriteDatabase, db->GetName().c_str());
    try {
        WriteTable(*stream);
    } catch (...) {
        db->CloseStream(stream);
        throw;
    }
    db->CloseStream(stream);
    QMX_CORR_TRACE(kTraceCategory, kTraceLevel,
                   "Wrote " << m_table.size() << " total strings. (including empty slots)");
    QMX_CORR_TRACE(kTraceCategory, kTraceLevel,
                   "Currently there are " << m_freeCount << " empty slots in the string table.");
    // The statistic sorts a copy of the whole table: the trace statement evaluates it only
    // when the record is written.
    QMX_CORR_TRACE(kTraceCategory, kTraceLevel,
                   "There are " << CountDuplicates()
                                << " strings that were duplicates of other strings or were "
                                   "empty slots.");
}

void Qmx_CorrNameRepo_Basic::Restore(Qmx_CorrDb* db) {
    Qmx_CorrStream* stream = db->OpenStream(kStreamName, kRestoreMode);
    if (!stream) {
        m_table.assign(1, Vesk::StringBase<char>());
        m_firstFreeSlot = 0;
        m_freeCount = 0;
        return;
    }
    try {
        ReadTable(*stream, db->GetName());
    } catch (...) {
        db->CloseStream(stream);
        throw;
    }
    db->CloseStream(stream);
    QMX_CORR_TRACE(kTraceCategory, kTraceLevel, "Read in " << m_table.size() - 1 << " strings.");
}

unsigned int Qmx_CorrNameRepo_Basic::GetNameArchiveSize() const { return 8; }

void Qmx_CorrNameRepo_Basic::ArchiveName(Qmx_CorrStorage& storage, Qmx_CorrNameHandle name) const {
    const Qmx_CorrName_Basic* record = GetValidRecord(name);
    storage.WriteUINT32(record ? record->GetRefCount() : 0);
    storage.WriteUINT32(record ? record->GetIndex() : 0);
}

Qmx_CorrNameHandle Qmx_CorrNameRepo_Basic::RestoreName(Qmx_CorrStorage& storage) {
    const unsigned int refCount = storage.ReadUINT32();
    const unsigned int index = storage.ReadUINT32();
    return Qmx_CorrNameHandle(new Qmx_CorrName_Basic(this, refCount, index));
}

Qmx_CorrNameHandle Qmx_CorrNameRepo_Basic::CreateName(const Vesk::StringBase<char>& text) {
    if (text.empty()) return GetNullName();
    // Make the record first: if the allocation fails, the table is unchanged.
    auto* record = new Qmx_CorrName_Basic(this, 1, 0);
    try {
        record->m_index = PlaceString(text);
    } catch (...) {
        delete record;
        throw;
    }
    return Qmx_CorrNameHandle(record);
}

Vesk::StringBase<char> Qmx_CorrNameRepo_Basic::GetString(Qmx_CorrNameHandle name) const {
    const Qmx_CorrName_Basic* record = GetValidRecord(name);
    return record ? m_table[record->GetIndex()] : Vesk::StringBase<char>();
}

Qmx_CorrNameHandle Qmx_CorrNameRepo_Basic::CopyName(Qmx_CorrNameHandle name) {
    Qmx_CorrName_Basic* record = AsBasic(name);
    if (!record || record->GetIndex() == 0) return GetNullName();
    ++record->m_refCount;
    ++record->m_holderCount;
    return name;
}

void Qmx_CorrNameRepo_Basic::ReleaseName(Qmx_CorrNameHandle name) {
    Qmx_CorrName_Basic* record = AsBasic(name);
    if (!record) return;
    if (GetValidRecord(name) && record->GetIndex() != 0) {
        if (--record->m_refCount == 0) FreeSlot(record->GetIndex());
    }
    DropHolder(record);
}

void Qmx_CorrNameRepo_Basic::DiscardName(Qmx_CorrNameHandle name) {
    Qmx_CorrName_Basic* record = AsBasic(name);
    if (record) DropHolder(record);
}

bool Qmx_CorrNameRepo_Basic::IsLess(Qmx_CorrNameHandle a, Qmx_CorrNameHandle b) const {
    if (a.GetRecord() == b.GetRecord()) return false;
    const Qmx_CorrName_Basic* left = GetValidRecord(a);
    const Qmx_CorrName_Basic* right = GetValidRecord(b);
    if (!left || !right) return false;
    return m_table[left->GetIndex()].Compare(m_table[right->GetIndex()]) < 0;
}

bool Qmx_CorrNameRepo_Basic::NamesStoredText(Qmx_CorrNameHandle name) {
    return GetValidRecord(name) != nullptr;
}

bool Qmx_CorrNameRepo_Basic::IsEqual(Qmx_CorrNameHandle a, Qmx_CorrNameHandle b) const {
    if (a.GetRecord() == b.GetRecord()) return true;
    const Qmx_CorrName_Basic* left = GetValidRecord(a);
    const Qmx_CorrName_Basic* right = GetValidRecord(b);
    if (!left || !right) return false;
    return m_table[left->GetIndex()] == m_table[right->GetIndex()];
}

Qmx_CorrNameRepo_Basic* Qmx_CorrNameRepo_Basic::GetDefault() {
    static Qmx_CorrNameRepo_Basic repository;
    return &repository;
}

Qmx_CorrNameHandle Qmx_CorrNameRepo_Basic::GetNullName() const {
    return Qmx_CorrNameHandle(m_nullRecord);
}

const Qmx_CorrName_Basic* Qmx_CorrNameRepo_Basic::GetValidRecord(Qmx_CorrNameHandle name) const {
    const Qmx_CorrName_Basic* record = AsBasic(name);
    if (!record || record->GetRepository() != this) return nullptr;
    return record->GetIndex() < m_table.size() ? record : nullptr;
}

unsigned int Qmx_CorrNameRepo_Basic::PlaceString(const Vesk::StringBase<char>& text) {
    if (m_freeCount == 0) {
        m_table.push_back(text);
        return static_cast<unsigned int>(m_table.size() - 1);
    }
    const unsigned int index = m_firstFreeSlot;
    assert(index > 0 && index < m_table.size());
    m_table[index] = text;
    --m_freeCount;
    if (m_freeCount != 0) m_firstFreeSlot = FindEmptySlot(m_table, index + 1);
    if (m_freeCount == 0 || m_firstFreeSlot == 0) {
        m_freeCount = 0;
        m_firstFreeSlot = 0;
    }
    return index;
}

void Qmx_CorrNameRepo_Basic::FreeSlot(unsigned int index) {
    // A slot that is already empty was freed before through a stale copy of its record;
    // counting it twice would make the counters disagree with the table.
    if (m_table[index].empty()) return;
    if (m_freeCount == 0 || index < m_firstFreeSlot) m_firstFreeSlot = index;
    ++m_freeCount;
    m_table[index].clear();
}

void Qmx_CorrNameRepo_Basic::DropHolder(Qmx_CorrName_Basic* record) {
    if (record->m_holderCount == 0) return;  // a null record
    if (--record->m_holderCount == 0) delete record;
}

std::size_t Qmx_CorrNameRepo_Basic::CountDuplicates() const {
    Table texts(m_table);
    std::sort(texts.begin(), texts.end());
    const auto distinct = std::unique(texts.begin(), texts.end()) - texts.begin();
    return m_table.size() - static_cast<std::size_t>(distinct);
}

void Qmx_CorrNameRepo_Basic::WriteTable(Qmx_CorrStream& stream) const {
    stream.WriteUINT32(kFormatVersion);
    stream.WriteUINT32(m_firstFreeSlot);
    stream.WriteUINT32(m_freeCount);
    stream.WriteUINT32(static_cast<unsigned int>(m_table.size() - 1));
    for (std::size_t i = 1; i < m_table.size(); ++i) stream.WriteString(m_table[i]);
}

void Qmx_CorrNameRepo_Basic::ReadTable(Qmx_CorrStream& stream,
                                       const Vesk::StringBase<char>& dbName) {
    if (stream.ReadUINT32() != kFormatVersion)
        QMX_CORR_THROW(InvalidDatabaseFormat, dbName.c_str());
    const unsigned int firstFreeSlot = stream.ReadUINT32();
    const unsigned int freeCount = stream.ReadUINT32();
    const unsigned int count = stream.ReadUINT32();
    // Compare the count with the bytes left first: a damaged count must not become a huge
    // allocation. Where the stream cannot tell (compressed), nothing is reserved and the
    // reads below end at the stream's end.
    const std::int64_t left = stream.BytesLeft();
    if (left >= 0 && count > left / kMinStringBytes) {
        QMX_CORR_THROW(InvalidDatabaseFormat, dbName.c_str());
    }
    Table table(1);
    if (left >= 0) table.reserve(std::size_t{count} + 1);
    for (unsigned int i = 0; i < count; ++i) table.push_back(stream.ReadString());
    if (stream.HasMoreBytes() || !CountersAgree(table, firstFreeSlot, freeCount)) {
        QMX_CORR_THROW(InvalidDatabaseFormat, dbName.c_str());
    }
    m_table.swap(table);
    m_firstFreeSlot = firstFreeSlot;
    m_freeCount = freeCount;
}
