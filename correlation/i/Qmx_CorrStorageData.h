// Qmx_CorrStorageData: what every record reader and writer of one open database shares: the
// container and implicit-relationship tables that references are ordinals of, the swizzlers
// of the two pool managers, and the record-format versions. Owned by the archive; plain data.
#ifndef QMX_CORRSTORAGEDATA_H
#define QMX_CORRSTORAGEDATA_H
#include <vector>

#include "QmxCorrExport.h"
#include "Qmx_CorrPtrSwizzlerT.h"

class Qmx_CorrManagedContainer;
class Qmx_CorrManagedImplicitRelationship;
class Qmx_CorrManagedItem;
class Qmx_CorrManagedExplicitRelationship;

struct QMX_CORR_EXPORT Qmx_CorrStorageData {
    // The record layouts this library writes.
    static constexpr unsigned int kContainerVersion = 1;
    static constexpr unsigned int kItemVersion = 2;
    static constexpr unsigned int kExpRelVersion = 1;
    static constexpr unsigned int kImpRelVersion = 1;
    static constexpr unsigned int kObjectDataVersion = 1;

    // Both tables hold only their null entry 0; no swizzlers; the versions written today.
    Qmx_CorrStorageData();

    // Entry 0 is null. While writing: every container sorted by address (std::less); while
    // reading: the containers in the order their records are restored.
    std::vector<Qmx_CorrManagedContainer*> containers;
    std::vector<Qmx_CorrManagedImplicitRelationship*> implicitRelationships;  // same rules
    Qmx_CorrPtrSwizzlerT<Qmx_CorrManagedItem, unsigned int>* itemSwizzler;    // not owned
    Qmx_CorrPtrSwizzlerT<Qmx_CorrManagedExplicitRelationship, unsigned int>* expRelSwizzler;
    unsigned int containerVersion;
    unsigned int itemVersion;
    unsigned int expRelVersion;
    unsigned int impRelVersion;
    unsigned int objectDataVersion;
};

#endif
