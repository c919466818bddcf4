#include "Qmx_CorrObjectOwner.h"

#include "Qmx_CorrItemDataMgr.h"
#include "Qmx_CorrNameRepo_Basic.h"
#include "Qmx_CorrRelDataMgr.h"

Qmx_CorrObjectOwner::Qmx_CorrObjectOwner() : Qmx_CorrObjectOwner(nullptr) {}

Qmx_CorrObjectOwner::Qmx_CorrObjectOwner(Qmx_CorrNameRepository* repo)
    : m_nameRepo(repo ? repo : Qmx_CorrNameRepo_Basic::GetDefault()),
      m_itemDataMgr(nullptr),
      m_relDataMgr(nullptr),
      m_nextContainerId(0) {
    m_itemDataMgr = new Qmx_CorrItemDataMgr(this);
    m_relDataMgr = new Qmx_CorrRelDataMgr(this);
}

Qmx_CorrObjectOwner::~Qmx_CorrObjectOwner() {
    delete m_itemDataMgr;
    delete m_relDataMgr;
}

Qmx_CorrManagedItemMgr* Qmx_CorrObjectOwner::GetManagedItemMgr() { return nullptr; }

Qmx_CorrDb* Qmx_CorrObjectOwner::GetDatabase() { return nullptr; }
