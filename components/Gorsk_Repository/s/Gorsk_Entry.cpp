// The component's entry point for the factory (BrokP_Factory.h): every request for the
// repository class makes a new, unopened repository object with one reference.
#include <new>

#include "BrokP_Factory.h"
#include "Gorsk_Repository.h"

extern "C" __attribute__((visibility("default"))) BrokI::IInterface* BrokP_CreateInstance(
    const Vesk::ClassId* classId) {
    static const Vesk::ClassId kRepositoryClass(Gorsk::kRepositoryClassId);
    if (!classId || *classId != kRepositoryClass) return nullptr;
    Gorsk::Repository* repository = new (std::nothrow) Gorsk::Repository();
    return repository ? static_cast<Gorsk::IRepository*>(repository) : nullptr;
}
