#include "Qmx_CorrDb_Gorsk.h"

#include <algorithm>
#include <exception>
#include <iostream>
#include <memory>
#include <typeinfo>

#include "BrokP_Factory.h"
#include "Gorsk_IDisposable.h"
#include "Gorsk_IRefCounted.h"
#include "Gorsk_IRepository.h"
#include "Gorsk_IStorage.h"
#include "Qmx_CorrDbg.h"
#include "Qmx_CorrException.h"
#include "Qmx_CorrStream_Gorsk.h"
#include "Vesk_ClassId.h"

namespace {

constexpr const char* kSourceFile = "s/Qmx_CorrDb_Gorsk";
constexpr const char* kRevision = "1";

constexpr const char* kComponentLibrary = "libGorsk_Repository";
constexpr const char* kClientName = "Qmx_CorrDb_Gorsk";
// Read, write, create when missing, shared with other clients (Gorsk_AccessMode.h).
constexpr int kRepositoryAccess = 43;

constexpr int kAccessRead = 1;
constexpr int kAccessWrite = 2;
constexpr int kAccessTruncate = 16;

// The component's stream access value for an open mode of Qmx_CorrDb; the portable bit has
// no counterpart.
int AccessMode(int mode) {
    int access = 0;
    if (mode & Qmx_CorrDb::kRead) access |= kAccessRead;
    if (mode & Qmx_CorrDb::kWrite) access |= kAccessWrite;
    if (mode & Qmx_CorrDb::kTruncate) access |= kAccessTruncate;
    return access;
}

// A failed load is tried again by the next database; a successful one is not repeated.
bool LoadComponent() {
    static bool loaded = false;
    if (!loaded) loaded = BrokP::Factory::LoadLibraryFactory(kComponentLibrary);
    return loaded;
}

BrokI::IInterface* Query(BrokI::IInterface* object, const char* interfaceId) {
    return object ? object->QueryInterface(Vesk::ClassId(interfaceId)) : nullptr;
}

// The component's instance through its repository interface, or null.
Gorsk::IRepository* FindRepository(BrokI::IInterface* instance) {
    return static_cast<Gorsk::IRepository*>(Query(instance, Gorsk::kIRepositoryId));
}

// Releases a component object: through its one-owner lifetime interface, or else through the
// reference-counted one, both reached from its base interface. Nothing when neither is there.
void ReleaseObject(BrokI::IInterface* object) {
    BrokI::IInterface* const base = Query(object, Gorsk::kIObjectId);
    if (!base) return;
    if (BrokI::IInterface* disposable = Query(base, Gorsk::kIDisposableId)) {
        static_cast<Gorsk::IDisposable*>(disposable)->Dispose();
    } else if (BrokI::IInterface* counted = Query(base, Gorsk::kIRefCountedId)) {
        static_cast<Gorsk::IRefCounted*>(counted)->Release();
    }
}

}  // namespace

Qmx_CorrDb_Gorsk::Qmx_CorrDb_Gorsk(const Vesk::StringBase<char>& name,
                                   const Vesk::StringBase<char>& storageName)
    : m_name(name), m_storageName(storageName), m_repository(nullptr), m_repoStorage(nullptr) {
    LoadComponent();
    static const Vesk::ClassId kRepositoryClass(Gorsk::kRepositoryClassId);
    BrokI::IInterface* const instance = BrokP::Factory::CreateInstance(kRepositoryClass);
    m_repository = FindRepository(instance);
    if (!m_repository) {
        Disconnect(false, instance);
        QMX_CORR_THROW(CannotReadDatabase, m_name.c_str());
    }
    Gorsk::IRepository* opened = nullptr;
    if (m_repository->Open(kClientName, m_name, kRepositoryAccess, &opened, 0) !=
            Gorsk::Status::kOk ||
        !opened) {
        Disconnect(false, instance);
        QMX_CORR_THROW(CannotReadDatabase, m_name.c_str());
    }
    if (opened->OpenStorage(m_storageName, kRepositoryAccess, &m_repoStorage) !=
            Gorsk::Status::kOk ||
        !m_repoStorage) {
        m_repoStorage = nullptr;
        Disconnect(true, instance);
        QMX_CORR_THROW(CannotReadDatabase, m_name.c_str());
    }
    QMX_CORR_TRACE("ARCHIVE", 10,
                   "Using storage '" << m_storageName << "' of repository " << m_name);
}

Qmx_CorrDb_Gorsk::~Qmx_CorrDb_Gorsk() {
    for (Qmx_CorrStream_Gorsk* stream : m_openStreams) delete stream;
    m_openStreams.clear();
    Disconnect(true, nullptr);
}

Vesk::StringBase<char> Qmx_CorrDb_Gorsk::GetName() const { return m_name; }

bool Qmx_CorrDb_Gorsk::StreamExists(const Vesk::StringBase<char>& /*name*/) const { return false; }

void Qmx_CorrDb_Gorsk::DeleteStream(const Vesk::StringBase<char>& /*name*/) {}

Qmx_CorrStream* Qmx_CorrDb_Gorsk::OpenStream(const Vesk::StringBase<char>& name, int mode) {
    try {
        auto stream =
            std::make_unique<Qmx_CorrStream_Gorsk>(m_repoStorage, name, AccessMode(mode), m_name);
        m_openStreams.push_back(stream.get());
        return stream.release();
    } catch (const std::exception&) {
        // The design's answer to a stream that cannot be opened is a null stream.
        QMX_CORR_TRACE("ARCHIVE", 10, "Cannot open stream '" << name << "' of " << m_name);
        return nullptr;
    }
}

void Qmx_CorrDb_Gorsk::CloseStream(Qmx_CorrStream* stream) {
    const auto found = std::find(m_openStreams.begin(), m_openStreams.end(), stream);
    if (!stream || found == m_openStreams.end()) return;
    const std::unique_ptr<Qmx_CorrStream_Gorsk> closing(*found);
    m_openStreams.erase(found);
    closing->Close();
}

void Qmx_CorrDb_Gorsk::SetStreamSize(const Vesk::StringBase<char>& /*name*/, int /*size*/) {}

void Qmx_CorrDb_Gorsk::Commit() const {}

bool Qmx_CorrDb_Gorsk::DbgValidateState() const { return true; }

void Qmx_CorrDb_Gorsk::DbgDump(std::ostream& out, unsigned int indent) const {
    Qmx_CorrDbg::PrintEmptyBlock(
        out, indent, Qmx_CorrDbg::GetDumpName(typeid(Qmx_CorrDb_Gorsk)) + ": '" + m_name + "'");
}

void Qmx_CorrDb_Gorsk::DbgDump() const { DbgDump(std::cerr, 0); }

void Qmx_CorrDb_Gorsk::Disconnect(bool opened, BrokI::IInterface* instance) {
    if (m_repoStorage) m_repository->ReleaseStorage(m_repoStorage);
    m_repoStorage = nullptr;
    if (opened) m_repository->Close();
    ReleaseObject(m_repository ? m_repository : instance);
    m_repository = nullptr;
}
