// Qmx_CorrImplicitRelationship: a derivation between two whole containers. An item beneath
// the source container corresponds to the item at the mirrored path beneath the destination
// container (its name optionally rewritten by a regular-expression transform), and the other
// way round; the relationship may create missing counterparts. Implemented by
// Qmx_CorrManagedImplicitRelationship; made by the manager, destroyed by Delete, with one of
// its containers or with the database.
#ifndef QMX_CORRIMPLICITRELATIONSHIP_H
#define QMX_CORRIMPLICITRELATIONSHIP_H
#include "QmxCorrExport.h"
#include "Qmx_CorrRelationship.h"

class Qmx_CorrContainer;
class Qmx_CorrItem;

class QMX_CORR_EXPORT Qmx_CorrImplicitRelationship : public Qmx_CorrRelationship {
public:
    // Stored with the relationship as a 32-bit value; searches follow it only in the
    // directions it allows.
    enum DIRECTION : unsigned int { DIR_SRC_TO_DST = 0, DIR_DST_TO_SRC = 1, DIR_BOTH = 2 };

    // "SRC -> DST", "SRC <- DST", "SRC <-> DST", and "ERROR!" for any other value.
    static const char* GetDirectionText(unsigned int direction);

    ~Qmx_CorrImplicitRelationship() override;
    Qmx_CorrImplicitRelationship() = default;
    Qmx_CorrImplicitRelationship(const Qmx_CorrImplicitRelationship&) = default;
    Qmx_CorrImplicitRelationship& operator=(const Qmx_CorrImplicitRelationship&) = default;

    virtual const Qmx_CorrContainer* GetSrcContainer() const = 0;
    virtual Qmx_CorrContainer* GetSrcContainer() = 0;
    virtual const Qmx_CorrContainer* GetDstContainer() const = 0;
    virtual Qmx_CorrContainer* GetDstContainer() = 0;
    // Whether a missing counterpart may be created.
    virtual bool CanCreateItems() const = 0;
    // The source-side counterpart of a destination item, or null. The const overloads forward
    // to the non-const ones (which may create the counterpart, see CanCreateItems).
    virtual const Qmx_CorrItem* GetSrcItem(const Qmx_CorrItem* dstItem) const;
    virtual Qmx_CorrItem* GetSrcItem(const Qmx_CorrItem* dstItem) = 0;
    // The destination-side counterpart of a source item, or null.
    virtual const Qmx_CorrItem* GetDstItem(const Qmx_CorrItem* srcItem) const;
    virtual Qmx_CorrItem* GetDstItem(const Qmx_CorrItem* srcItem) = 0;
    virtual DIRECTION GetDirection() const = 0;
    // The match expression of the name transform; null without a transform.
    virtual const char* GetSrcExpression() const = 0;
    // The replacement format of the name transform; null without a transform.
    virtual const char* GetDstFormat() const = 0;
    // Destroys the relationship through its database; the pointer is dangling afterwards.
    virtual void Delete() = 0;
};

#endif
