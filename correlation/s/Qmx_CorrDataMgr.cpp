#include "Qmx_CorrDataMgr.h"

#include <algorithm>
#include <iostream>
#include <typeinfo>

#include "Qmx_CorrArchive.h"
#include "Qmx_CorrDbg.h"
#include "Qmx_CorrException.h"
#include "Qmx_CorrItemDataMgr.h"
#include "Qmx_CorrItemRelOverflowMgr.h"
#include "Qmx_CorrManagedContainer.h"
#include "Qmx_CorrManagedExplicitRelationship.h"
#include "Qmx_CorrManagedImplicitRelationship.h"
#include "Qmx_CorrManagedItem.h"
#include "Qmx_CorrObjectData.h"
#include "Qmx_CorrRelItemOverflowMgr.h"
#include "Vesk_File.h"
#include "Vesk_MsgManData.h"

namespace {
const char* const kSourceFile = "s/Qmx_CorrDataMgr";
const char* const kRevision = "1";

Vesk::StringBase<char> AbsoluteNameOf(const Qmx_CorrItem* item) {
    return item ? item->GetAbsoluteName() : Vesk::StringBase<char>();
}

// The first equal entry leaves the list; the others keep their order.
template <class T>
void EraseFirst(std::vector<T*>& list, T* entry) {
    auto it = std::find(list.begin(), list.end(), entry);
    if (it != list.end()) list.erase(it);
}

}  // namespace

Qmx_CorrDataMgr::Qmx_CorrDataMgr(const Vesk::StringBase<char>& dbName,
                                 const Vesk::StringBase<char>& tempDir, bool readOnly,
                                 Qmx_CorrNameRepository* repo)
    : Qmx_CorrObjectOwner(repo, true),
      m_top(nullptr),
      m_dbName(dbName),
      m_tempDir(tempDir),
      m_readOnly(readOnly),
      m_modified(false),
      m_corrMgr(nullptr) {
    try {
        Open();
    } catch (...) {
        Close();
        throw;
    }
}

void Qmx_CorrDataMgr::Open() {
    m_itemMgr.reset(new Qmx_CorrManagedItemMgr(Qmx_CorrManagedItem::GetArchiveSize(this)));
    m_expRelMgr.reset(
        new Qmx_CorrManagedExpRelMgr(Qmx_CorrManagedExplicitRelationship::GetArchiveSize(this)));
    m_itemRelOverflow.reset(new Qmx_CorrItemRelOverflowMgr(m_itemMgr->GetNewSwizzler()));
    m_relItemOverflow.reset(new Qmx_CorrRelItemOverflowMgr(m_expRelMgr->GetNewSwizzler()));
    if (!m_dbName.empty() && (!m_readOnly || Vesk::File::exist(m_dbName.c_str()))) {
        m_archive.reset(new Qmx_CorrArchive(m_dbName, m_tempDir, m_itemMgr.get(), m_expRelMgr.get(),
                                            m_itemRelOverflow.get(), m_relItemOverflow.get(),
                                            this));
        m_top = m_archive->GetTopContainer();
        if (m_top) TakeImplicitRelationships();
    }
    if (!m_top) m_top = new Qmx_CorrManagedContainer("/", this, nullptr);
    if (m_readOnly) return;
    m_modified = true;
    if (m_archive) Commit();
}

void Qmx_CorrDataMgr::TakeImplicitRelationships() {
    const unsigned int count = m_archive->GetNumImplicitRelationships();
    m_implicitRelationships.reserve(count);
    for (unsigned int i = 0; i < count; ++i) {
        if (Qmx_CorrManagedImplicitRelationship* rel = m_archive->GetImplicitRelationship(i))
            m_implicitRelationships.push_back(rel);
    }
}

Qmx_CorrDataMgr::~Qmx_CorrDataMgr() { Close(); }

void Qmx_CorrDataMgr::Close() {
    // The tree first, while everything its listeners may look at is still there.
    delete m_top;
    m_top = nullptr;
    for (Qmx_CorrManagedImplicitRelationship* rel : m_implicitRelationships) delete rel;
    m_implicitRelationships.clear();
    m_archive.reset();
    m_itemMgr.reset();
    m_expRelMgr.reset();
    m_itemRelOverflow.reset();
    m_relItemOverflow.reset();
    Qmx_CorrObjectData::ReleaseDefaultObjectData(this);
}

Qmx_CorrManagedItem* Qmx_CorrDataMgr::AsItem(Qmx_CorrItem* item) const {
    return static_cast<Qmx_CorrManagedItem*>(item);
}

void Qmx_CorrDataMgr::LinkRelationshipItem(Qmx_CorrExplicitRelationship* rel, Qmx_CorrItem* item,
                                           unsigned end) {
    const unsigned int handle =
        m_expRelMgr->GetHandle(static_cast<Qmx_CorrManagedExplicitRelationship*>(rel));
    if (end == kSourceEnd)
        AsItem(item)->AddOutgoingRelationship(handle);
    else if (end == kDestinationEnd)
        AsItem(item)->AddIncomingRelationship(handle);
    SetModified();
}

void Qmx_CorrDataMgr::UnlinkRelationshipItem(Qmx_CorrExplicitRelationship* rel, Qmx_CorrItem* item,
                                             unsigned end) {
    const unsigned int handle =
        m_expRelMgr->GetHandle(static_cast<Qmx_CorrManagedExplicitRelationship*>(rel));
    if (end == kSourceEnd)
        AsItem(item)->RemoveOutgoingRelationship(handle);
    else if (end == kDestinationEnd)
        AsItem(item)->RemoveIncomingRelationship(handle);
    SetModified();
}

void Qmx_CorrDataMgr::DeleteContainer(Qmx_CorrManagedContainer* container) {
    auto* parent = static_cast<Qmx_CorrManagedContainer*>(container->GetParent());
    if (parent) parent->NotifyContainerRemoved(container);
    GetItemDataMgr()->RemoveContainer(container);
    SetModified();
    QMX_CORR_TRACE("BUILD", 10, "Deleting container '" << container->GetAbsoluteName() << "'");
}

void Qmx_CorrDataMgr::DeleteItem(Qmx_CorrManagedItem* item) {
    SetModified();
    for (Qmx_CorrExplicitRelationship* rel : item->GetOutgoingRelationships())
        if (rel) rel->RemoveSrcItem(item);
    for (Qmx_CorrExplicitRelationship* rel : item->GetIncomingRelationships())
        if (rel) rel->RemoveDstItem(item);
    QMX_CORR_TRACE("BUILD", 10, "Deleting item '" << item->GetAbsoluteName() << "'");
    m_itemRelOverflow->RemoveLists(item);
    m_itemMgr->Destroy(item);
}

void Qmx_CorrDataMgr::DeleteExplicitRelationship(Qmx_CorrManagedExplicitRelationship* rel) {
    SetModified();
    const unsigned int handle = m_expRelMgr->GetHandle(rel);
    for (Qmx_CorrItem* item : rel->GetSrcItems())
        if (item) AsItem(item)->RemoveOutgoingRelationship(handle);
    for (Qmx_CorrItem* item : rel->GetDstItems())
        if (item) AsItem(item)->RemoveIncomingRelationship(handle);
    m_relItemOverflow->RemoveLists(rel);
    m_expRelMgr->Destroy(rel);
}

void Qmx_CorrDataMgr::DeleteImplicitRelationship(Qmx_CorrManagedImplicitRelationship* rel) {
    if (auto* src = static_cast<Qmx_CorrManagedContainer*>(rel->GetSrcContainer()))
        src->RemoveOutgoingRelationship(rel);
    if (auto* dst = static_cast<Qmx_CorrManagedContainer*>(rel->GetDstContainer()))
        dst->RemoveIncomingRelationship(rel);
    EraseFirst(m_implicitRelationships, rel);
    SetModified();
    delete rel;
}

Qmx_CorrManagedItem* Qmx_CorrDataMgr::CreateManagedItem(Qmx_CorrNameHandle name,
                                                        Qmx_CorrContainer* parent,
                                                        unsigned containerId) {
    return m_itemMgr->CreateManagedItem(name, this, parent, containerId);
}

Qmx_CorrDb* Qmx_CorrDataMgr::GetDatabase() {
    return m_archive ? m_archive->GetDatabase() : nullptr;
}

const Qmx_CorrManagedItem* Qmx_CorrDataMgr::GetItemPtr(unsigned handle) const {
    return m_itemMgr->GetPtr(handle);
}

Qmx_CorrManagedItem* Qmx_CorrDataMgr::GetItemPtr(unsigned handle) {
    return m_itemMgr->GetPtr(handle);
}

unsigned Qmx_CorrDataMgr::GetItemHandle(const Qmx_CorrManagedItem* item) {
    return m_itemMgr->GetHandle(item);
}

const Qmx_CorrManagedExplicitRelationship* Qmx_CorrDataMgr::GetExpRelPtr(unsigned handle) const {
    return m_expRelMgr->GetPtr(handle);
}

Qmx_CorrManagedExplicitRelationship* Qmx_CorrDataMgr::GetExpRelPtr(unsigned handle) {
    return m_expRelMgr->GetPtr(handle);
}

Qmx_CorrManagedExplicitRelationship* Qmx_CorrDataMgr::CreateExplicitRelationship(
    Qmx_CorrItem* src, Qmx_CorrItem* dst) {
    if (src == dst) QMX_CORR_THROW(SrcAndDstIdentical);
    Qmx_CorrManagedExplicitRelationship* rel = m_expRelMgr->CreateManagedExpRel(this);
    if (!rel) QMX_CORR_THROW(InvalidRequest, "CreateExplicitRelationship: no pool slot is left");
    try {
        if (src) rel->AddSrcItem(src);
        if (dst) rel->AddDstItem(dst);
    } catch (...) {
        // A refused end must not leave a half-made relationship behind.
        rel->Delete();
        throw;
    }
    SetModified();
    QMX_CORR_TRACE("BUILD", 10,
                   "Created explicit relationship between '" << AbsoluteNameOf(src) << "' --> '"
                                                             << AbsoluteNameOf(dst) << "'");
    return rel;
}

Qmx_CorrManagedImplicitRelationship* Qmx_CorrDataMgr::CreateImplicitRelationship(
    Qmx_CorrContainer* src, Qmx_CorrContainer* dst, bool canCreateItems,
    Qmx_CorrImplicitRelationship::DIRECTION dir, const char* srcExpression, const char* dstFormat) {
    auto* managedSrc = dynamic_cast<Qmx_CorrManagedContainer*>(src);
    if (!managedSrc) QMX_CORR_THROW(InvalidSrcItem, "NULL");
    auto* managedDst = dynamic_cast<Qmx_CorrManagedContainer*>(dst);
    if (!managedDst) QMX_CORR_THROW(InvalidDstItem, "NULL");
    // A relationship between databases would dangle when either closes.
    if (managedSrc->GetOwner() != this)
        QMX_CORR_THROW(InvalidSrcItem, managedSrc->GetAbsoluteName().c_str());
    if (managedDst->GetOwner() != this)
        QMX_CORR_THROW(InvalidDstItem, managedDst->GetAbsoluteName().c_str());
    if (managedSrc == managedDst) QMX_CORR_THROW(SrcAndDstIdentical);
    Qmx_CorrManagedImplicitRelationship* rel = nullptr;
    if (srcExpression) {
        try {
            rel = new Qmx_CorrManagedImplicitRelationship(this, managedSrc, managedDst,
                                                          canCreateItems, dir, srcExpression,
                                                          dstFormat ? dstFormat : "");
        } catch (const boost::regex_error&) {
            QMX_CORR_THROW(BadExpression, srcExpression);
        }
    } else if (dstFormat) {
        QMX_CORR_THROW(BadExpression);
    } else {
        rel = new Qmx_CorrManagedImplicitRelationship(this, managedSrc, managedDst, canCreateItems,
                                                      dir);
    }
    managedSrc->AddOutgoingRelationship(rel);
    managedDst->AddIncomingRelationship(rel);
    m_implicitRelationships.push_back(rel);
    SetModified();
    QMX_CORR_TRACE("BUILD", 10,
                   "Created implicit relationship between '"
                       << managedSrc->GetAbsoluteName() << "' --> '"
                       << managedDst->GetAbsoluteName() << "'");
    return rel;
}

void Qmx_CorrDataMgr::Commit() {
    if (!m_modified || m_readOnly || !m_archive) return;
    m_archive->Commit(GetNameRepo(), GetItemDataMgr(), GetRelDataMgr(), m_itemRelOverflow.get(),
                      m_relItemOverflow.get(), m_top, this);
    m_modified = false;
}

void Qmx_CorrDataMgr::FlushAll() {
    if (!m_archive) return;
    m_top->FlushAll(false);
    m_itemMgr->FlushAllPools(true);
    m_expRelMgr->FlushAllPools(true);
}

bool Qmx_CorrDataMgr::DbgValidateState() const {
    const auto report = [](int line, const char* text) {
        Vesk_MsgManData::createObject("Quillmark", kSourceFile, line, kRevision)
            .issueError("%s", text);
    };
    bool valid = true;
    if (!m_top) {
        report(__LINE__, "Qmx_CorrDataMgr top level container is NULL.\n");
        valid = false;
    }
    if (!m_itemMgr) {
        report(__LINE__, "Qmx_CorrDataMgr item manager is NULL.\n");
        valid = false;
    }
    if (!m_expRelMgr) {
        report(__LINE__, "Qmx_CorrDataMgr rel manager is NULL.\n");
        valid = false;
    }
    return valid && m_top->DbgValidateState() && m_itemMgr->DbgValidateState() &&
           m_expRelMgr->DbgValidateState();
}

void Qmx_CorrDataMgr::DbgDump(std::ostream& out, unsigned indent) const {
    Qmx_CorrDbg::Println(out, indent, "%s",
                         Qmx_CorrDbg::GetDumpName(typeid(Qmx_CorrDataMgr)).c_str());
    Qmx_CorrDbg::Println(out, indent, "{");
    m_itemMgr->DbgDump(out, indent + 1);
    m_expRelMgr->DbgDump(out, indent + 1);
    Qmx_CorrDbg::Println(out, indent, "}");
}

void Qmx_CorrDataMgr::DbgDump() const { DbgDump(std::cerr, 0); }
