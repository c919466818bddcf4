#include "Qmx_CorrManagedImplicitRelationship.h"

#include <algorithm>
#include <iostream>
#include <string>
#include <typeinfo>
#include <vector>

#include "Qmx_CorrContainer.h"
#include "Qmx_CorrDbg.h"
#include "Qmx_CorrException.h"
#include "Qmx_CorrItem.h"
#include "Qmx_CorrManagedContainer.h"
#include "Qmx_CorrObjectOwner.h"
#include "Qmx_CorrRelDataMgr.h"
#include "Qmx_CorrStorage.h"
#include "Qmx_CorrStorageData.h"
#include "Vesk_MsgManData.h"

namespace {

constexpr const char* kSourceFile = "s/Qmx_CorrManagedImplicitRelationship";
constexpr const char* kRevision = "1";

bool Lists(const std::vector<Qmx_CorrImplicitRelationship*>& list,
           const Qmx_CorrImplicitRelationship* rel) {
    return std::find(list.begin(), list.end(), rel) != list.end();
}

// The storage tables hold managed containers; every container of a database is one.
void* AsTableEntry(Qmx_CorrContainer* container) {
    return static_cast<Qmx_CorrManagedContainer*>(container);
}

// The containers from just below `anchor` down to `parent`, nearest to the anchor first;
// `found` tells whether `parent` lies at or beneath the anchor.
std::vector<const Qmx_CorrContainer*> PathBelow(const Qmx_CorrContainer* parent,
                                                const Qmx_CorrContainer* anchor, bool& found) {
    std::vector<const Qmx_CorrContainer*> path;
    found = false;
    for (const Qmx_CorrContainer* c = parent; c; c = c->GetParent()) {
        if (c == anchor) {
            found = true;
            break;
        }
        path.push_back(c);
    }
    std::reverse(path.begin(), path.end());
    return path;
}

}  // namespace

Qmx_CorrManagedImplicitRelationship::~Qmx_CorrManagedImplicitRelationship() = default;

Qmx_CorrManagedImplicitRelationship::Qmx_CorrManagedImplicitRelationship(Qmx_CorrObjectOwner* owner,
                                                                         Qmx_CorrContainer* src,
                                                                         Qmx_CorrContainer* dst,
                                                                         bool canCreateItems,
                                                                         DIRECTION direction)
    : m_src(src), m_dst(dst), m_canCreateItems(canCreateItems), m_direction(direction) {
    if (!src) QMX_CORR_THROW(InvalidSrcItem);
    if (!dst) QMX_CORR_THROW(InvalidDstItem);
    m_data = owner->GetRelDataMgr()->GetDefaultData();
}

Qmx_CorrManagedImplicitRelationship::Qmx_CorrManagedImplicitRelationship(
    Qmx_CorrObjectOwner* owner, Qmx_CorrContainer* src, Qmx_CorrContainer* dst, bool canCreateItems,
    DIRECTION direction, const char* srcExpression, const char* dstFormat)
    : Qmx_CorrManagedImplicitRelationship(owner, src, dst, canCreateItems, direction) {
    m_srcExpression = srcExpression;
    m_dstFormat = dstFormat;
    if (!m_srcExpression.empty()) m_expression.assign(m_srcExpression);
}

Qmx_CorrManagedImplicitRelationship::Qmx_CorrManagedImplicitRelationship(Qmx_CorrStorage& storage,
                                                                         Qmx_CorrObjectOwner* owner)
    : m_src(nullptr), m_dst(nullptr), m_canCreateItems(false), m_direction(DIR_BOTH) {
    const char* const dbName = storage.GetName().c_str();
    if (storage.GetData().impRelVersion != Qmx_CorrStorageData::kImpRelVersion)
        QMX_CORR_THROW(InvalidDatabaseFormat, dbName);
    // An index beyond the table or of a free slot is damage, not a caller's mistake.
    const unsigned int index = storage.ReadUINT32();
    Qmx_CorrRelDataMgr* const relDataMgr = owner->GetRelDataMgr();
    if (index >= relDataMgr->GetSlotCount()) QMX_CORR_THROW(InvalidDatabaseFormat, dbName);
    m_data = relDataMgr->GetData(index);
    if (!m_data) QMX_CORR_THROW(InvalidDatabaseFormat, dbName);
    m_src = storage.ReadContainerPtr();
    m_dst = storage.ReadContainerPtr();
    if (!m_src || !m_dst) QMX_CORR_THROW(InvalidDatabaseFormat, dbName);
    m_canCreateItems = storage.ReadBool();
    // Kept as stored: a value outside the three directions is followed both ways.
    m_direction = static_cast<DIRECTION>(storage.ReadUINT32());
    if (storage.ReadBool()) ReadTransform(storage);
}

// The writer stores a transform only with an expression, so an empty one is damage too.
void Qmx_CorrManagedImplicitRelationship::ReadTransform(Qmx_CorrStorage& storage) {
    const char* const dbName = storage.GetName().c_str();
    m_srcExpression = storage.ReadString();
    if (m_srcExpression.empty()) QMX_CORR_THROW(InvalidDatabaseFormat, dbName);
    try {
        m_expression.assign(m_srcExpression);
    } catch (const boost::regex_error&) {
        QMX_CORR_THROW(InvalidDatabaseFormat, dbName);
    }
    m_dstFormat = storage.ReadString();
}

const Qmx_CorrObjectData* Qmx_CorrManagedImplicitRelationship::GetObjectData() const {
    return m_data.get();
}

// Held by the table slot and this relationship only: the record is this relationship's own.
Qmx_CorrObjectData* Qmx_CorrManagedImplicitRelationship::GetObjectDataForWrite() {
    if (m_data.use_count() != 2)
        m_data = GetOwner()->GetRelDataMgr()->CreateData(m_data->GetName());
    return m_data.get();
}

Vesk::StringBase<char> Qmx_CorrManagedImplicitRelationship::GetName() const {
    return m_data->GetName();
}

bool Qmx_CorrManagedImplicitRelationship::DbgValidateState() const {
    if (!m_src) {
        Vesk_MsgManData::debugStub("Implicit relationship contains NULL source container\n");
        return false;
    }
    if (!m_dst) {
        Vesk_MsgManData::debugStub("Implicit relationship contains NULL destination container\n");
        return false;
    }
    if (m_src == m_dst) {
        Vesk_MsgManData::debugStub(
            "Implicit relationship source and destination containers are identical\n");
        return false;
    }
    const Qmx_CorrContainer* const src = m_src;
    if (!Lists(src->GetOutgoingRelationships(), this)) {
        Vesk_MsgManData::debugStub(
            "Relationship has container '%s' as a source but the container does not list this "
            "relationship.\n",
            src->GetAbsoluteName().c_str());
        return false;
    }
    const Qmx_CorrContainer* const dst = m_dst;
    if (!Lists(dst->GetIncomingRelationships(), this)) {
        Vesk_MsgManData::debugStub(
            "Relationship has container '%s' as a destination but the container does not list "
            "this relationship.\n",
            dst->GetAbsoluteName().c_str());
        return false;
    }
    return Qmx_CorrImplicitRelationship::DbgValidateState();
}

void Qmx_CorrManagedImplicitRelationship::DbgDump(std::ostream& out, unsigned indent) const {
    const std::string type = Qmx_CorrDbg::GetDumpName(typeid(Qmx_CorrManagedImplicitRelationship));
    Qmx_CorrDbg::Println(out, indent, "%s:", type.c_str());
    Qmx_CorrDbg::Println(out, indent, "{");
    Qmx_CorrDbg::Println(out, indent + 1, "Source container:      %s",
                         m_src->GetAbsoluteName().c_str());
    Qmx_CorrDbg::Println(out, indent + 1, "Destination container: %s",
                         m_dst->GetAbsoluteName().c_str());
    Qmx_CorrDbg::Println(out, indent + 1, "Can create items: %s",
                         m_canCreateItems ? "true" : "false");
    Qmx_CorrDbg::Println(out, indent + 1, "Travseral direction: %s", GetDirectionText(m_direction));
    if (!m_srcExpression.empty()) {
        Qmx_CorrDbg::Println(out, indent + 1, "Transforms '%s' to '%s'", m_srcExpression.c_str(),
                             m_dstFormat.c_str());
    }
    Qmx_CorrObject::DbgDump(out, indent + 1);
    Qmx_CorrDbg::Println(out, indent, "}");
}

void Qmx_CorrManagedImplicitRelationship::DbgDump() const { DbgDump(std::cerr, 0); }

Qmx_CorrItem* Qmx_CorrManagedImplicitRelationship::GetSrcItem(const Qmx_CorrItem* dstItem) {
    return MapToSrc(dstItem, true);
}

Qmx_CorrItem* Qmx_CorrManagedImplicitRelationship::GetDstItem(const Qmx_CorrItem* srcItem) {
    return MapToDst(srcItem, true);
}

const char* Qmx_CorrManagedImplicitRelationship::GetSrcExpression() const {
    return m_srcExpression.empty() ? nullptr : m_srcExpression.c_str();
}

const char* Qmx_CorrManagedImplicitRelationship::GetDstFormat() const {
    return m_srcExpression.empty() ? nullptr : m_dstFormat.c_str();
}

void Qmx_CorrManagedImplicitRelationship::Delete() {
    Qmx_CorrObjectOwner* const owner = GetOwner();
    owner->GetRelDataMgr()->ReleaseData(m_data);
    owner->DeleteImplicitRelationship(this);
}

Qmx_CorrItem* Qmx_CorrManagedImplicitRelationship::MapToDst(const Qmx_CorrItem* srcItem,
                                                            bool allowCreate) {
    if (m_direction == DIR_DST_TO_SRC) QMX_CORR_THROW(InvalidDirection);
    return MapItem(srcItem, m_src, m_dst, true, allowCreate && m_canCreateItems);
}

Qmx_CorrItem* Qmx_CorrManagedImplicitRelationship::MapToSrc(const Qmx_CorrItem* dstItem,
                                                            bool allowCreate) {
    if (m_direction == DIR_SRC_TO_DST) QMX_CORR_THROW(InvalidDirection);
    return MapItem(dstItem, m_dst, m_src, false, allowCreate && m_canCreateItems);
}

// A pathological expression can exhaust the matcher's budget on a long name; the caller then
// learns that the expression is unusable rather than meeting a foreign exception.
Vesk::StringBase<char> Qmx_CorrManagedImplicitRelationship::TransformName(
    const Vesk::StringBase<char>& name) const {
    if (m_srcExpression.empty()) return name;
    try {
        return boost::regex_replace(static_cast<const std::string&>(name), m_expression,
                                    static_cast<const std::string&>(m_dstFormat));
    } catch (const std::runtime_error&) {
        QMX_CORR_THROW(BadExpression, m_srcExpression.c_str());
    }
}

void Qmx_CorrManagedImplicitRelationship::Archive(Qmx_CorrStorage& storage) const {
    storage.GetData().impRelVersion = Qmx_CorrStorageData::kImpRelVersion;
    storage.WriteUINT32(GetOwner()->GetRelDataMgr()->GetIndex(m_data.get()));
    storage.WriteContainerPtr(AsTableEntry(m_src));
    storage.WriteContainerPtr(AsTableEntry(m_dst));
    storage.WriteBool(m_canCreateItems);
    storage.WriteUINT32(m_direction);
    const bool hasTransform = !m_srcExpression.empty();
    storage.WriteBool(hasTransform);
    if (!hasTransform) return;
    storage.WriteString(m_srcExpression);
    storage.WriteString(m_dstFormat);
}

Qmx_CorrItem* Qmx_CorrManagedImplicitRelationship::MapItem(const Qmx_CorrItem* item,
                                                           const Qmx_CorrContainer* anchor,
                                                           Qmx_CorrContainer* side,
                                                           bool itemIsSource, bool create) {
    if (!item) {
        if (itemIsSource) QMX_CORR_THROW(InvalidSrcItem);
        QMX_CORR_THROW(InvalidDstItem);
    }
    bool inside = false;
    const std::vector<const Qmx_CorrContainer*> path = PathBelow(item->GetParent(), anchor, inside);
    if (!inside) {
        const Vesk::StringBase<char> name = item->GetAbsoluteName();
        if (itemIsSource) QMX_CORR_THROW(InvalidSrcItem, name.c_str());
        QMX_CORR_THROW(InvalidDstItem, name.c_str());
    }
    for (const Qmx_CorrContainer* step : path) {
        if (!side) break;
        const Vesk::StringBase<char> name = step->GetName();
        Qmx_CorrContainer* next = side->GetContainer(name);
        if (!next && create) next = side->CreateContainer(name);
        side = next;
    }
    if (!side) return nullptr;
    const Vesk::StringBase<char> name = TransformName(item->GetName());
    Qmx_CorrItem* result = side->GetItem(name);
    if (!result && create) result = side->CreateItem(name);
    return result;
}
