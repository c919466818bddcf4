#include "Qmx_CorrObjectOwner.h"

#include <memory>

#include "Qmx_CorrItemDataMgr.h"
#include "Qmx_CorrNameRepo_Basic.h"
#include "Qmx_CorrRelDataMgr.h"

Qmx_CorrObjectOwner::Qmx_CorrObjectOwner() : Qmx_CorrObjectOwner(nullptr) {}

Qmx_CorrObjectOwner::Qmx_CorrObjectOwner(Qmx_CorrNameRepository* repo)
    : Qmx_CorrObjectOwner(repo, false) {}

Qmx_CorrObjectOwner::Qmx_CorrObjectOwner(Qmx_CorrNameRepository* repo, bool privateRepo)
    : m_nameRepo(repo),
      m_itemDataMgr(nullptr),
      m_relDataMgr(nullptr),
      m_nextContainerId(0),
      m_ownRepo(nullptr) {
    std::unique_ptr<Qmx_CorrNameRepository> ownRepo;
    if (!m_nameRepo && privateRepo) {
        ownRepo.reset(new Qmx_CorrNameRepo_Basic());
        m_nameRepo = ownRepo.get();
    }
    if (!m_nameRepo) m_nameRepo = Qmx_CorrNameRepo_Basic::GetDefault();
    std::unique_ptr<Qmx_CorrItemDataMgr> itemDataMgr(new Qmx_CorrItemDataMgr(this));
    m_relDataMgr = new Qmx_CorrRelDataMgr(this);
    m_itemDataMgr = itemDataMgr.release();
    m_ownRepo = ownRepo.release();
}

Qmx_CorrObjectOwner::~Qmx_CorrObjectOwner() {
    delete m_itemDataMgr;
    delete m_relDataMgr;
    delete m_ownRepo;
}

Qmx_CorrManagedItemMgr* Qmx_CorrObjectOwner::GetManagedItemMgr() { return nullptr; }

Qmx_CorrDb* Qmx_CorrObjectOwner::GetDatabase() { return nullptr; }
