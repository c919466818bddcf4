// Qmx_CorrItemRelOverflowMgrI: where an item keeps a relationship list that is too long for
// its pooled record (more than one handle), under the item and a selector. Reached through
// the object owner; implemented by Qmx_CorrItemRelOverflowMgr. One thread at a time.
#ifndef QMX_CORRITEMRELOVERFLOWMGRI_H
#define QMX_CORRITEMRELOVERFLOWMGRI_H
#include <vector>

#include "QmxCorrExport.h"

class Qmx_CorrManagedItem;

class QMX_CORR_EXPORT Qmx_CorrItemRelOverflowMgrI {
public:
    // Selectors.
    static constexpr int kIncoming = 0;  // relationships that lead to the item
    static constexpr int kOutgoing = 1;  // relationships that lead from the item

    // A copy of the explicit-relationship handles kept for (item, selector); empty if none.
    virtual std::vector<unsigned int> GetList(const Qmx_CorrManagedItem* item, int selector) = 0;
    // Forgets both lists of the item.
    virtual void RemoveLists(const Qmx_CorrManagedItem* item) = 0;
    // Keeps a copy of `list`, replacing what was kept; returns the kept list.
    virtual const std::vector<unsigned int>& SetList(const Qmx_CorrManagedItem* item, int selector,
                                                     const std::vector<unsigned int>& list) = 0;
    virtual ~Qmx_CorrItemRelOverflowMgrI();

protected:
    Qmx_CorrItemRelOverflowMgrI() = default;
};

#endif
