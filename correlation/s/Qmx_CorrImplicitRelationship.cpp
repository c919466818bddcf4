#include "Qmx_CorrImplicitRelationship.h"

const char* Qmx_CorrImplicitRelationship::GetDirectionText(unsigned int direction) {
    switch (direction) {
        case DIR_SRC_TO_DST:
            return "SRC -> DST";
        case DIR_DST_TO_SRC:
            return "SRC <- DST";
        case DIR_BOTH:
            return "SRC <-> DST";
        default:
            return "ERROR!";
    }
}

Qmx_CorrImplicitRelationship::~Qmx_CorrImplicitRelationship() = default;

const Qmx_CorrItem* Qmx_CorrImplicitRelationship::GetSrcItem(const Qmx_CorrItem* dstItem) const {
    return const_cast<Qmx_CorrImplicitRelationship*>(this)->GetSrcItem(dstItem);
}

const Qmx_CorrItem* Qmx_CorrImplicitRelationship::GetDstItem(const Qmx_CorrItem* srcItem) const {
    return const_cast<Qmx_CorrImplicitRelationship*>(this)->GetDstItem(srcItem);
}
