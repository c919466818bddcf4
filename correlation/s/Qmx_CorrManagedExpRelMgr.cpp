#include "Qmx_CorrManagedExpRelMgr.h"

namespace {

constexpr const char* kPoolStream = "Qmx_CorrManagedExpRelMgr";
constexpr const char* kFreePoolStream = "Qmx_CorrManagedExpRelMgr_Data";
// Relationships belong to no container: they all share the pools of id 0.
constexpr unsigned int kContainerId = 0;

}  // namespace

Qmx_CorrManagedExpRelMgr::Qmx_CorrManagedExpRelMgr(unsigned int recordSize)
    : Qmx_CorrObjMgrT(kPoolStream, kFreePoolStream, recordSize) {}

Qmx_CorrManagedExpRelMgr::~Qmx_CorrManagedExpRelMgr() = default;

Qmx_CorrManagedExplicitRelationship* Qmx_CorrManagedExpRelMgr::CreateManagedExpRel(
    Qmx_CorrObjectOwner* owner) {
    return CreateObject(kContainerId, owner);
}
