#include "Qmx_CorrMgr.h"

#include <iostream>
#include <typeinfo>

#include "Qmx_CorrDataMgr.h"
#include "Qmx_CorrDbg.h"
#include "Qmx_CorrException.h"
#include "Vesk_MsgManData.h"

namespace {
const char* const kSourceFile = "s/Qmx_CorrMgr";
const char* const kRevision = "1";

const Qmx_CorrObjectOwner* OwnerOf(const Qmx_CorrObject* object) {
    if (auto* item = dynamic_cast<const Qmx_CorrManagedItem*>(object)) return item->GetOwner();
    if (auto* container = dynamic_cast<const Qmx_CorrManagedContainer*>(object))
        return container->GetOwner();
    if (auto* rel = dynamic_cast<const Qmx_CorrManagedExplicitRelationship*>(object))
        return rel->GetOwner();
    if (auto* rel = dynamic_cast<const Qmx_CorrManagedImplicitRelationship*>(object))
        return rel->GetOwner();
    return nullptr;
}

}  // namespace

Qmx_CorrMgr::Qmx_CorrMgr(const Vesk::StringBase<char>& dbName,
                         const Vesk::StringBase<char>& tempDir, DB_MODE mode,
                         Qmx_CorrNameRepository* repo)
    : m_impl(new Qmx_CorrDataMgr(dbName, tempDir, mode == DB_READ_ONLY, repo)) {
    m_impl->SetCorrMgr(this);
}

Qmx_CorrMgr::~Qmx_CorrMgr() {
    Qmx_CorrEvent::GetCorrMgrDeletedEmitter().Fire(this);
    delete m_impl;
}

Qmx_CorrContainer* Qmx_CorrMgr::GetTopContainer() { return m_impl->GetTopContainer(); }

const Qmx_CorrContainer* Qmx_CorrMgr::GetTopContainer() const { return m_impl->GetTopContainer(); }

Qmx_CorrExplicitRelationship* Qmx_CorrMgr::CreateExplicitRelationship(Qmx_CorrItem* src,
                                                                      Qmx_CorrItem* dst) {
    return m_impl->CreateExplicitRelationship(src, dst);
}

Qmx_CorrImplicitRelationship* Qmx_CorrMgr::CreateImplicitRelationship(
    Qmx_CorrContainer* src, Qmx_CorrContainer* dst, bool canCreateItems,
    Qmx_CorrImplicitRelationship::DIRECTION dir) {
    return m_impl->CreateImplicitRelationship(src, dst, canCreateItems, dir, nullptr, nullptr);
}

Qmx_CorrImplicitRelationship* Qmx_CorrMgr::CreateImplicitRelationship(
    Qmx_CorrContainer* src, Qmx_CorrContainer* dst, bool canCreateItems,
    Qmx_CorrImplicitRelationship::DIRECTION dir, const char* srcExpression, const char* dstFormat) {
    return m_impl->CreateImplicitRelationship(src, dst, canCreateItems, dir, srcExpression,
                                              dstFormat);
}

void Qmx_CorrMgr::FlushAll() const { m_impl->FlushAll(); }

bool Qmx_CorrMgr::IsModified() const { return m_impl->IsModified(); }

bool Qmx_CorrMgr::CanCommit() const {
    return !m_impl->IsReadOnly() && !m_impl->GetDbName().empty();
}

void Qmx_CorrMgr::Commit() const {
    if (m_impl->IsReadOnly()) QMX_CORR_THROW(DatabaseIsReadonly, m_impl->GetDbName().c_str());
    if (m_impl->GetDbName().empty()) QMX_CORR_THROW(DatabaseIsReadonly);
    m_impl->Commit();
}

const Qmx_CorrMgr* Qmx_CorrMgr::GetCorrMgrForObject(const Qmx_CorrObject* object) {
    auto* dataMgr = dynamic_cast<const Qmx_CorrDataMgr*>(OwnerOf(object));
    return dataMgr ? dataMgr->GetCorrMgr() : nullptr;
}

Qmx_CorrMgr* Qmx_CorrMgr::GetCorrMgrForObject(Qmx_CorrObject* object) {
    return const_cast<Qmx_CorrMgr*>(
        GetCorrMgrForObject(static_cast<const Qmx_CorrObject*>(object)));
}

bool Qmx_CorrMgr::DbgValidateState() const {
    if (!m_impl) {
        Vesk_MsgManData::createObject("Quillmark", kSourceFile, __LINE__, kRevision)
            .issueError("Qmx_CorrMgr implemenation object is NULL.\n");
        return false;
    }
    return m_impl->DbgValidateState();
}

void Qmx_CorrMgr::DbgDump(std::ostream& out, unsigned indent) const {
    Qmx_CorrDbg::Println(out, indent, "%s", Qmx_CorrDbg::GetDumpName(typeid(Qmx_CorrMgr)).c_str());
    Qmx_CorrDbg::Println(out, indent, "{");
    if (m_impl) m_impl->DbgDump(out, indent + 1);
    Qmx_CorrDbg::Println(out, indent, "}");
}

void Qmx_CorrMgr::DbgDump() const { DbgDump(std::cerr, 0); }
