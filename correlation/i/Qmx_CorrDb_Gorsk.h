// Qmx_CorrDb_Gorsk: a database whose streams live in one storage of the project-repository
// component instead of a database file. The component, libGorsk_Repository, is loaded at run
// time through the component factory (once per process, until a load succeeds) and reached
// only through its interfaces; the library never links it. The repository keeps every stream
// itself and stores each one, whole, when it is closed, so Commit, DeleteStream and
// SetStreamSize have nothing to do and StreamExists cannot tell. Made by hosts; owns the
// streams it hands out and the component's repository instance. One thread at a time.
#ifndef QMX_CORRDB_GORSK_H
#define QMX_CORRDB_GORSK_H
#include <ostream>
#include <vector>

#include "QmxCorrExport.h"
#include "Qmx_CorrDb.h"
#include "Vesk_StringBase.h"

namespace BrokI {
class IInterface;
}  // namespace BrokI

namespace Gorsk {
class IRepository;
class IStorage;
}  // namespace Gorsk

class Qmx_CorrStream_Gorsk;

class QMX_CORR_EXPORT Qmx_CorrDb_Gorsk : public Qmx_CorrDb {
public:
    // Opens the repository `name` for reading and writing (made when missing) and its storage
    // `storageName` (made when missing). Throws CannotReadDatabase with `name` when the
    // component cannot be loaded or gives no repository, or the repository or the storage
    // cannot be opened; nothing stays open or allocated then.
    Qmx_CorrDb_Gorsk(const Vesk::StringBase<char>& name, const Vesk::StringBase<char>& storageName);
    // Closes every stream still open (storing what was written), then the storage and the
    // repository, and releases the component's instance.
    ~Qmx_CorrDb_Gorsk() override;
    Qmx_CorrDb_Gorsk(const Qmx_CorrDb_Gorsk&) = delete;
    Qmx_CorrDb_Gorsk& operator=(const Qmx_CorrDb_Gorsk&) = delete;

    // The repository name.
    Vesk::StringBase<char> GetName() const override;
    // Always false: the component is not asked.
    bool StreamExists(const Vesk::StringBase<char>& name) const override;
    // Does nothing.
    void DeleteStream(const Vesk::StringBase<char>& name) override;
    // A Qmx_CorrStream_Gorsk opened with the component's access value 1 for read, 2 for
    // write, 3 for both, plus 16 for truncate; the portable bit is ignored. Null when the component
    // gives no stream, e.g. for reading a stream that does not exist.
    Qmx_CorrStream* OpenStream(const Vesk::StringBase<char>& name, int mode) override;
    // Closes and destroys a stream this database handed out; any other pointer is left
    // alone. Throws CannotWriteDatabase with the repository name when what was written could
    // not be stored (the stream is destroyed nevertheless).
    void CloseStream(Qmx_CorrStream* stream) override;
    // Does nothing.
    void SetStreamSize(const Vesk::StringBase<char>& name, int size) override;
    // Does nothing: each stream is stored when it is closed.
    void Commit() const override;
    bool DbgValidateState() const override;
    void DbgDump(std::ostream& out, unsigned int indent) const override;
    void DbgDump() const override;

private:
    // Undoes the opening steps that were done, in reverse: the storage, the repository's
    // open, then the instance itself (through `instance` while no repository interface is
    // known).
    void Disconnect(bool opened, BrokI::IInterface* instance);

    Vesk::StringBase<char> m_name;                     // the repository name
    Vesk::StringBase<char> m_storageName;              // the storage inside the repository
    Gorsk::IRepository* m_repository;                  // the component's; released at the end
    Gorsk::IStorage* m_repoStorage;                    // the open storage
    std::vector<Qmx_CorrStream_Gorsk*> m_openStreams;  // handed out, not yet closed; owned
};

#endif
