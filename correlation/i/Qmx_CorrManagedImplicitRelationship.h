// Qmx_CorrManagedImplicitRelationship: the implicit relationship of a database. An item at a
// relative path beneath the source container corresponds to the item at the same relative
// path beneath the destination container, its name optionally rewritten by a regular
// expression (boost::regex, default syntax) and a replacement format; each match in the name is
// replaced, the text between matches kept. Missing counterparts, containers on the path
// included, are created when the relationship allows it. Not pooled: the data manager owns
// implicit relationships and both containers list them. One thread at a time.
//
// Record (impRelVersion 1; primitives as the storage writes them):
//   1  data index             UINT32, the slot of the relationship data
//   2  source container       container ordinal
//   3  destination container  container ordinal
//   4  can create items       Bool
//   5  direction              UINT32
//   6  has transform          Bool
//   7  expression, format     two strings, only when has transform is true
#ifndef QMX_CORRMANAGEDIMPLICITRELATIONSHIP_H
#define QMX_CORRMANAGEDIMPLICITRELATIONSHIP_H
#include <boost/regex.hpp>
#include <boost/shared_ptr.hpp>
#include <iosfwd>

#include "QmxCorrExport.h"
#include "Qmx_CorrImplicitRelationship.h"
#include "Qmx_CorrRelData.h"

class Qmx_CorrObjectOwner;
class Qmx_CorrStorage;

class QMX_CORR_EXPORT Qmx_CorrManagedImplicitRelationship : public Qmx_CorrImplicitRelationship {
public:
    ~Qmx_CorrManagedImplicitRelationship() override;

    // Without a transform. Throws InvalidSrcItem for a null source, then InvalidDstItem for a
    // null destination.
    Qmx_CorrManagedImplicitRelationship(Qmx_CorrObjectOwner* owner, Qmx_CorrContainer* src,
                                        Qmx_CorrContainer* dst, bool canCreateItems,
                                        DIRECTION direction);
    // With a transform; a malformed expression throws boost::regex_error.
    Qmx_CorrManagedImplicitRelationship(Qmx_CorrObjectOwner* owner, Qmx_CorrContainer* src,
                                        Qmx_CorrContainer* dst, bool canCreateItems,
                                        DIRECTION direction, const char* srcExpression,
                                        const char* dstFormat);
    // Reads one record; the containers list the relationship by their own records. Throws
    // InvalidDatabaseFormat (storage name) unless impRelVersion is 1, for a data index of a
    // free slot, null containers or a malformed stored expression.
    Qmx_CorrManagedImplicitRelationship(Qmx_CorrStorage& storage, Qmx_CorrObjectOwner* owner);
    Qmx_CorrManagedImplicitRelationship(const Qmx_CorrManagedImplicitRelationship&) = delete;
    Qmx_CorrManagedImplicitRelationship& operator=(const Qmx_CorrManagedImplicitRelationship&) =
        delete;

    const Qmx_CorrObjectData* GetObjectData() const override;
    Qmx_CorrObjectData* GetObjectDataForWrite() override;
    Vesk::StringBase<char> GetName() const override;
    // Both containers set, different, and listing the relationship; the first failure goes to
    // the debug output.
    bool DbgValidateState() const override;
    void DbgDump(std::ostream& out, unsigned indent) const override;
    void DbgDump() const override;
    const Qmx_CorrContainer* GetSrcContainer() const override { return m_src; }
    Qmx_CorrContainer* GetSrcContainer() override { return m_src; }
    const Qmx_CorrContainer* GetDstContainer() const override { return m_dst; }
    Qmx_CorrContainer* GetDstContainer() override { return m_dst; }
    bool CanCreateItems() const override { return m_canCreateItems; }
    using Qmx_CorrImplicitRelationship::GetSrcItem;
    // Throws InvalidDirection for DIR_SRC_TO_DST, InvalidDstItem for null or for an item not
    // beneath the destination container (with its absolute name). Containers created on the
    // path before a later failure stay.
    Qmx_CorrItem* GetSrcItem(const Qmx_CorrItem* dstItem) override;
    using Qmx_CorrImplicitRelationship::GetDstItem;
    // Throws InvalidDirection for DIR_DST_TO_SRC, InvalidSrcItem for null or for an item not
    // beneath the source container (with its absolute name).
    Qmx_CorrItem* GetDstItem(const Qmx_CorrItem* srcItem) override;
    DIRECTION GetDirection() const override { return m_direction; }
    const char* GetSrcExpression() const override;
    const char* GetDstFormat() const override;
    // The object must not be used afterwards.
    void Delete() override;

    Qmx_CorrObjectOwner* GetOwner() const { return m_data->GetOwner(); }
    // GetDstItem and GetSrcItem with the creation of missing counterparts (and the containers
    // on their path) allowed or not; allowed only where CanCreateItems is true too. A search
    // that must not create again where it has created once uses these.
    Qmx_CorrItem* MapToDst(const Qmx_CorrItem* srcItem, bool allowCreate);
    Qmx_CorrItem* MapToSrc(const Qmx_CorrItem* dstItem, bool allowCreate);
    // The name with the transform applied (unchanged without one). Throws BadExpression (the
    // expression) when the matcher gives up on the name, as a pathological expression can.
    Vesk::StringBase<char> TransformName(const Vesk::StringBase<char>& name) const;
    void Archive(Qmx_CorrStorage& storage) const;

private:
    // The expression and format of a stored transform.
    void ReadTransform(Qmx_CorrStorage& storage);
    // The counterpart of `item` beneath `anchor`, mirrored beneath `side`; an item outside
    // `anchor` throws InvalidSrcItem (itemIsSource) or InvalidDstItem with its absolute name.
    Qmx_CorrItem* MapItem(const Qmx_CorrItem* item, const Qmx_CorrContainer* anchor,
                          Qmx_CorrContainer* side, bool itemIsSource, bool create);

    boost::shared_ptr<Qmx_CorrRelData> m_data;
    Qmx_CorrContainer* m_src;  // not owned
    Qmx_CorrContainer* m_dst;  // not owned
    bool m_canCreateItems;
    DIRECTION m_direction;
    Vesk::StringBase<char> m_srcExpression;  // empty: no transform
    boost::regex m_expression;               // compiled from m_srcExpression
    Vesk::StringBase<char> m_dstFormat;
};

#endif
