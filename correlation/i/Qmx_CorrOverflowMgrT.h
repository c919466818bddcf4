// Qmx_CorrOverflowMgrT: the lists of handles that are too long for the inline room of a
// pooled record, kept under (object handle, selector) and written whole to one stream of
// their own. The design of both overflow managers (Qmx_CorrItemRelOverflowMgr for the
// relationship lists of items, Qmx_CorrRelItemOverflowMgr for the item lists of explicit
// relationships); they differ only in their objects and in Traits:
//   Traits::kSourceFile, Traits::kRevision  what their exceptions carry
//   Traits::WriteElement(storage, handle), Traits::ReadElement(storage)  one list element
// Owned by the data manager; owns the swizzler that turns its key objects into handles.
// One thread at a time.
//
// Stream layout (every field 4 bytes, least significant byte first):
//   offset  size  field
//   0       4     format, always 0
//   4       4     entry count E
//   8       ...   E entries in ascending key order (handle unsigned, then selector signed):
//                   +0  4      object handle
//                   +4  4      selector, 0 or 1
//                   +8  4      element count N
//                   +12 4 * N  the elements, in list order (duplicates allowed)
// Nothing follows the last entry.
#ifndef QMX_CORROVERFLOWMGRT_H
#define QMX_CORROVERFLOWMGRT_H
#include <cassert>
#include <cstdint>
#include <map>
#include <utility>
#include <vector>

#include "QmxCorrExport.h"
#include "Qmx_CorrException.h"
#include "Qmx_CorrPtrSwizzlerT.h"
#include "Qmx_CorrStorage.h"

template <class T, class Interface, class Traits>
class QMX_CORR_EXPORT Qmx_CorrOverflowMgrT : public Interface {
public:
    using Object = T;
    using Handles = std::vector<unsigned int>;
    using Swizzler = Qmx_CorrPtrSwizzlerT<T, unsigned int>;

    static constexpr unsigned int kFormat = 0;
    // The only selectors: 0 and 1 (the object's two lists).
    static constexpr int kMaxSelector = 1;

    // Takes ownership of `swizzler`. REQUIRES: swizzler is not null.
    explicit Qmx_CorrOverflowMgrT(Swizzler* swizzler) : m_swizzler(swizzler) { assert(m_swizzler); }
    // Deletes the swizzler, then the lists.
    ~Qmx_CorrOverflowMgrT() override { delete m_swizzler; }
    Qmx_CorrOverflowMgrT(const Qmx_CorrOverflowMgrT&) = delete;
    Qmx_CorrOverflowMgrT& operator=(const Qmx_CorrOverflowMgrT&) = delete;

    // A copy of the list kept for (object, selector); empty when there is none. Swizzler
    // failures (an object its pool manager does not know) pass through.
    Handles GetList(const T* object, int selector) override {
        const auto found = m_lists.find(Key(HandleOf(object), selector));
        return found == m_lists.end() ? Handles() : found->second;
    }

    // Forgets both lists of `object`; nothing happens when it has none.
    void RemoveLists(const T* object) override {
        const unsigned int handle = HandleOf(object);
        for (int selector = 0; selector <= kMaxSelector; ++selector) {
            m_lists.erase(Key(handle, selector));
        }
    }

    // Keeps a copy of `list` for (object, selector), replacing what was kept. The reference
    // stays valid until the entry is replaced or removed. A selector other than 0 or 1
    // throws InvalidRequest and keeps nothing: no reader could restore it.
    const Handles& SetList(const T* object, int selector, const Handles& list) override {
        if (selector < 0 || selector > kMaxSelector) {
            throw Qmx_CorrException::InvalidRequest("Quillmark", Traits::kSourceFile,
                                                    Traits::kRevision, __LINE__,
                                                    "SetList: the selector is neither 0 nor 1");
        }
        Handles& stored = m_lists[Key(HandleOf(object), selector)];
        stored = list;
        return stored;
    }

    // Writes every entry in the layout above.
    void Archive(Qmx_CorrStorage& storage) const {
        storage.WriteUINT32(kFormat);
        storage.WriteUINT32(static_cast<unsigned int>(m_lists.size()));
        for (const auto& entry : m_lists) {
            storage.WriteUINT32(entry.first.first);
            storage.WriteUINT32(static_cast<unsigned int>(entry.first.second));
            storage.WriteUINT32(static_cast<unsigned int>(entry.second.size()));
            for (unsigned int element : entry.second) Traits::WriteElement(storage, element);
        }
    }

    // Reads the layout above and keeps every entry, replacing lists kept under the same
    // keys. Throws InvalidDatabaseFormat with the storage's name for another format, counts
    // the bytes left cannot hold, selectors other than 0 and 1, keys out of order or twice,
    // bytes after the last entry, or data that ends early; the manager is unchanged then.
    void Restore(Qmx_CorrStorage& storage) {
        if (storage.ReadUINT32() != kFormat) Refuse(storage, __LINE__);
        const unsigned int entries = storage.ReadUINT32();
        storage.CheckCount(entries, kEntryHeadSize);
        std::map<Key, Handles> restored;
        for (unsigned int i = 0; i < entries; ++i) {
            std::pair<Key, Handles> entry = ReadEntry(storage);
            if (!restored.empty() && !(restored.rbegin()->first < entry.first)) {
                Refuse(storage, __LINE__);
            }
            restored.emplace_hint(restored.end(), std::move(entry));
        }
        if (storage.BytesLeft() > 0) Refuse(storage, __LINE__);
        for (auto& entry : restored) m_lists[entry.first] = std::move(entry.second);
    }

private:
    // (object handle, selector): ordered by the handle, then by the signed selector.
    using Key = std::pair<unsigned int, int>;
    static constexpr std::uint64_t kEntryHeadSize = 12;
    static constexpr std::uint64_t kElementSize = 4;

    unsigned int HandleOf(const T* object) const {
        // The swizzler's interface is not const-correct; it only looks the object up.
        return m_swizzler->GetHandle(const_cast<T*>(object));
    }

    static std::pair<Key, Handles> ReadEntry(Qmx_CorrStorage& storage) {
        const unsigned int handle = storage.ReadUINT32();
        const unsigned int selector = storage.ReadUINT32();
        if (selector > static_cast<unsigned int>(kMaxSelector)) Refuse(storage, __LINE__);
        const unsigned int count = storage.ReadUINT32();
        storage.CheckCount(count, kElementSize);
        Handles list;
        // Reserve only what the bytes left have proved can follow.
        if (storage.BytesLeft() >= 0) list.reserve(count);
        for (unsigned int i = 0; i < count; ++i) list.push_back(Traits::ReadElement(storage));
        return {Key(handle, static_cast<int>(selector)), std::move(list)};
    }

    [[noreturn]] static void Refuse(const Qmx_CorrStorage& storage, int line) {
        throw Qmx_CorrException::InvalidDatabaseFormat(
            "Quillmark", Traits::kSourceFile, Traits::kRevision, line, storage.GetName().c_str());
    }

    std::map<Key, Handles> m_lists;
    Swizzler* m_swizzler;  // owned
};

#endif
