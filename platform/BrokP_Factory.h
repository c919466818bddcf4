// BrokP::Factory: loads components at run time and makes their class instances. A component
// is a shared library "<name>.so" exporting the C function
//     BrokI::IInterface* BrokP_CreateInstance(const Vesk::ClassId* classId);
// which returns a new instance of the class, or null when it does not know the class.
// Components stay loaded until the process ends. One thread at a time.
#ifndef BROKP_FACTORY_H
#define BROKP_FACTORY_H
#include "BrokI_IInterface.h"
#include "VeskExport.h"
#include "Vesk_ClassId.h"

namespace BrokP {

// The signature of the entry point a component exports.
using CreateInstanceFn = BrokI::IInterface* (*)(const Vesk::ClassId* classId);
constexpr const char* kCreateInstanceSymbol = "BrokP_CreateInstance";

class VESK_EXPORT Factory {
public:
    // Loads "<name>.so", looked for in the directories of QMX_COMPONENT_PATH (colon-separated),
    // then in the directory of the portability layer's own library, then on the default search
    // path. True when the component is loaded (also when it was loaded before).
    static bool LoadLibraryFactory(const char* name);
    // Asks every loaded component, in load order; null when none makes the class.
    static BrokI::IInterface* CreateInstance(const Vesk::ClassId& classId);
};

}  // namespace BrokP

#endif
