#include "Qmx_CorrStorage.h"

#include <algorithm>
#include <functional>

#include "Qmx_CorrException.h"
#include "Qmx_CorrManagedContainer.h"
#include "Qmx_CorrStream.h"
#include "Vesk_Endian.h"

namespace {

constexpr const char* kSourceFile = "s/Qmx_CorrStorage";
constexpr const char* kRevision = "1";

// The position of `p` in a table sorted by std::less after its null entry 0; 0 for null.
// An object missing from the table has no ordinal: the lower bound would be a neighbour's,
// and the record would silently refer to another object.
template <class T>
unsigned int OrdinalOf(const std::vector<T*>& table, void* p, const char* what) {
    if (!p) return 0;
    T* const object = static_cast<T*>(p);
    const auto found = std::lower_bound(table.begin() + 1, table.end(), object, std::less<T*>());
    if (found == table.end() || *found != object) QMX_CORR_THROW(InvalidRequest, what);
    return static_cast<unsigned int>(found - table.begin());
}

// Without a swizzler only the null reference can be written: a real object would become
// the null handle and its link would be lost.
template <class T>
unsigned int HandleOf(Qmx_CorrPtrSwizzlerT<T, unsigned int>* swizzler, void* p, const char* what) {
    T* const object = static_cast<T*>(p);
    if (swizzler) return swizzler->GetHandle(object);
    if (object) QMX_CORR_THROW(InvalidRequest, what);
    return 0;
}

}  // namespace

Qmx_CorrStorage::Qmx_CorrStorage(const Vesk::StringBase<char>& name, Qmx_CorrStream* stream,
                                 Qmx_CorrStorageData& data)
    : m_name(name), m_stream(stream), m_data(data) {}

Vesk::StringBase<char> Qmx_CorrStorage::ReadString() { return m_stream->ReadString(); }
void Qmx_CorrStorage::WriteString(const Vesk::StringBase<char>& text) {
    m_stream->WriteString(text);
}
bool Qmx_CorrStorage::ReadBool() { return m_stream->ReadBool(); }
void Qmx_CorrStorage::WriteBool(bool value) { m_stream->WriteBool(value); }
unsigned char Qmx_CorrStorage::ReadUINT8() { return m_stream->ReadUINT8(); }
void Qmx_CorrStorage::WriteUINT8(unsigned char value) { m_stream->WriteUINT8(value); }
unsigned int Qmx_CorrStorage::ReadUINT32() { return m_stream->ReadUINT32(); }
void Qmx_CorrStorage::WriteUINT32(unsigned int value) { m_stream->WriteUINT32(value); }

unsigned int Qmx_CorrStorage::ReadOrdinal(std::size_t tableSize) {
    const unsigned int ordinal = m_stream->ReadUINT32();
    if (ordinal >= tableSize) QMX_CORR_THROW(InvalidDatabaseFormat, m_name.c_str());
    return ordinal;
}

Qmx_CorrManagedContainer* Qmx_CorrStorage::ReadManagedContainerPtr() {
    return m_data.containers[ReadOrdinal(m_data.containers.size())];
}

Qmx_CorrContainer* Qmx_CorrStorage::ReadContainerPtr() { return ReadManagedContainerPtr(); }

Qmx_CorrManagedImplicitRelationship* Qmx_CorrStorage::ReadManagedImpRelPtr() {
    return m_data.implicitRelationships[ReadOrdinal(m_data.implicitRelationships.size())];
}

void Qmx_CorrStorage::WriteContainerPtr(void* p) {
    m_stream->WriteUINT32(
        OrdinalOf(m_data.containers, p, "WriteContainerPtr: the container is not in the table"));
}

void Qmx_CorrStorage::WriteImpRelPtr(void* p) {
    m_stream->WriteUINT32(OrdinalOf(m_data.implicitRelationships, p,
                                    "WriteImpRelPtr: the relationship is not in the table"));
}

Qmx_CorrManagedItem* Qmx_CorrStorage::ReadManagedItemPtr() {
    const unsigned int handle = ReadHandle();
    if (!m_data.itemSwizzler) {
        if (handle != 0) QMX_CORR_THROW(InvalidDatabaseFormat, m_name.c_str());
        return nullptr;
    }
    return m_data.itemSwizzler->GetPtr(handle);
}

void Qmx_CorrStorage::WriteItemPtr(void* p) {
    WriteHandle(HandleOf(m_data.itemSwizzler, p, "WriteItemPtr: no item swizzler"));
}

Qmx_CorrManagedExplicitRelationship* Qmx_CorrStorage::ReadManagedExpRelPtr() {
    const unsigned int handle = ReadHandle();
    if (!m_data.expRelSwizzler) {
        if (handle != 0) QMX_CORR_THROW(InvalidDatabaseFormat, m_name.c_str());
        return nullptr;
    }
    return m_data.expRelSwizzler->GetPtr(handle);
}

void Qmx_CorrStorage::WriteExpRelPtr(void* p) {
    WriteHandle(
        HandleOf(m_data.expRelSwizzler, p, "WriteExpRelPtr: no explicit-relationship swizzler"));
}

unsigned int Qmx_CorrStorage::ReadHandle() {
    char bytes[4];
    m_stream->read(bytes, 4);
    return Vesk_Endian::DecodeUINT32LE(bytes);
}

void Qmx_CorrStorage::WriteHandle(unsigned int handle) {
    char bytes[4];
    Vesk_Endian::EncodeUINT32LE(handle, bytes);
    m_stream->write(bytes, 4);
}

std::int64_t Qmx_CorrStorage::BytesLeft() const { return m_stream->BytesLeft(); }

void Qmx_CorrStorage::CheckCount(std::uint64_t count, std::uint64_t bytesEach) const {
    const std::int64_t left = BytesLeft();
    if (left < 0) return;
    // Divide rather than multiply: an absurd count must not overflow into a small product.
    if (bytesEach != 0 && count > static_cast<std::uint64_t>(left) / bytesEach) {
        QMX_CORR_THROW(InvalidDatabaseFormat, m_name.c_str());
    }
}
