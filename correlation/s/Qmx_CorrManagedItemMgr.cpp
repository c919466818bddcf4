#include "Qmx_CorrManagedItemMgr.h"

namespace {

constexpr const char* kPoolStream = "Qmx_CorrManagedItemMgr";
constexpr const char* kFreePoolStream = "Qmx_CorrManagedItemMgr_Data";

}  // namespace

Qmx_CorrManagedItemMgr::Qmx_CorrManagedItemMgr(unsigned int recordSize)
    : Qmx_CorrObjMgrT(kPoolStream, kFreePoolStream, recordSize) {}

Qmx_CorrManagedItemMgr::~Qmx_CorrManagedItemMgr() = default;

Qmx_CorrManagedItem* Qmx_CorrManagedItemMgr::CreateManagedItem(Qmx_CorrNameHandle name,
                                                               Qmx_CorrObjectOwner* owner,
                                                               Qmx_CorrContainer* container,
                                                               unsigned int containerId) {
    return CreateObject(containerId, name, owner, container);
}
