// Qmx_CorrRelItemOverflowMgrI: where an explicit relationship keeps an item list that is too
// long for its pooled record (more than two handles), under the relationship and a
// selector. Reached through the object owner; implemented by Qmx_CorrRelItemOverflowMgr.
// One thread at a time.
#ifndef QMX_CORRRELITEMOVERFLOWMGRI_H
#define QMX_CORRRELITEMOVERFLOWMGRI_H
#include <vector>

#include "QmxCorrExport.h"

class Qmx_CorrManagedExplicitRelationship;

class QMX_CORR_EXPORT Qmx_CorrRelItemOverflowMgrI {
public:
    // Selectors.
    static constexpr int kSources = 0;
    static constexpr int kDestinations = 1;

    // A copy of the item handles kept for (relationship, selector); empty if none.
    virtual std::vector<unsigned int> GetList(
        const Qmx_CorrManagedExplicitRelationship* relationship, int selector) = 0;
    // Forgets both lists of the relationship.
    virtual void RemoveLists(const Qmx_CorrManagedExplicitRelationship* relationship) = 0;
    // Keeps a copy of `list`, replacing what was kept; returns the kept list.
    virtual const std::vector<unsigned int>& SetList(
        const Qmx_CorrManagedExplicitRelationship* relationship, int selector,
        const std::vector<unsigned int>& list) = 0;
    virtual ~Qmx_CorrRelItemOverflowMgrI();

protected:
    Qmx_CorrRelItemOverflowMgrI() = default;
};

#endif
