// Gorsk::IStorage: one named storage of a repository, a set of named streams. Handed out by
// IRepository::OpenStorage and destroyed by IRepository::ReleaseStorage. Several storages of
// one repository live side by side; a stream name means the same stream only within one
// storage.
#ifndef GORSK_ISTORAGE_H
#define GORSK_ISTORAGE_H
#include "Gorsk_IObject.h"
#include "Gorsk_Status.h"
#include "Vesk_StringBase.h"

namespace Gorsk {

constexpr const char* kIStorageId = "4002d5fa-16e5-4973-97c0-b8bb3f28a964";

class IStream;

class IStorage : public IObject {
public:
    // Opens the stream `streamName` (not empty; any bytes) with access 1, 2 or 3, plus 16
    // with write (Gorsk_AccessMode.h). For reading only, a missing stream gives kNotFound;
    // with write, a missing stream is made when it is closed. Write needs a storage opened
    // with write (kReadOnly otherwise). *stream is null on failure. The stream belongs to this
    // storage until CloseStream.
    virtual Status OpenStream(const Vesk::StringBase<char>& streamName, int accessMode,
                              IStream** stream) = 0;
    // Destroys the stream. A stream opened with write is first stored, whole, in one
    // transaction: before that, other clients and later opens see its previous content (or
    // none), so a process that ends while writing leaves the previous content intact. The
    // stream is destroyed also when storing fails (kStoreError, kReadOnly); kBadRequest for a
    // stream that this storage did not hand out.
    virtual Status CloseStream(IStream* stream) = 0;

protected:
    ~IStorage() override = default;
};

}  // namespace Gorsk

#endif
