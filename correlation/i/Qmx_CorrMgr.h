// Qmx_CorrMgr: a host's handle on one correlation database. Opening it (the constructor) gives
// the top container "/", from which containers and items are made; the manager creates
// relationships, flushes, commits and, destroyed, closes the database without committing.
// This header gives a host the whole object model. Owns its Qmx_CorrDataMgr. One thread at a
// time per manager and its objects.
#ifndef QMX_CORRMGR_H
#define QMX_CORRMGR_H
#include <iosfwd>

#include "QmxCorrExport.h"
#include "Qmx_CorrContainer.h"
#include "Qmx_CorrEvent.h"
#include "Qmx_CorrExplicitRelationship.h"
#include "Qmx_CorrImplicitRelationship.h"
#include "Qmx_CorrItem.h"
#include "Qmx_CorrManagedContainer.h"
#include "Qmx_CorrManagedExplicitRelationship.h"
#include "Qmx_CorrManagedImplicitRelationship.h"
#include "Qmx_CorrManagedItem.h"
#include "Vesk_StringBase.h"

class Qmx_CorrDataMgr;
class Qmx_CorrNameRepository;

class QMX_CORR_EXPORT Qmx_CorrMgr {
public:
    enum DB_MODE : unsigned int { DB_READ_WRITE = 0, DB_READ_ONLY = 1 };

    // Opens `dbName`, or a database without a file when it is empty. A missing file is
    // created and committed at once unless the mode is DB_READ_ONLY (any other mode is read
    // and write). `tempDir`, when not empty, is where the database makes its own temporary
    // directory; `repo` null gives the database a private name repository. Errors of opening
    // leave the constructor.
    Qmx_CorrMgr(const Vesk::StringBase<char>& dbName, const Vesk::StringBase<char>& tempDir,
                DB_MODE mode, Qmx_CorrNameRepository* repo);
    // Notifies the manager-deleted listeners, then closes; nothing is committed.
    virtual ~Qmx_CorrMgr();
    Qmx_CorrMgr(const Qmx_CorrMgr&) = delete;
    Qmx_CorrMgr& operator=(const Qmx_CorrMgr&) = delete;

    Qmx_CorrContainer* GetTopContainer();
    const Qmx_CorrContainer* GetTopContainer() const;
    // Throws SrcAndDstIdentical when both are the same (two nulls included). Marks the
    // database modified.
    Qmx_CorrExplicitRelationship* CreateExplicitRelationship(Qmx_CorrItem* src, Qmx_CorrItem* dst);
    // Without a name transform.
    Qmx_CorrImplicitRelationship* CreateImplicitRelationship(
        Qmx_CorrContainer* src, Qmx_CorrContainer* dst, bool canCreateItems,
        Qmx_CorrImplicitRelationship::DIRECTION dir);
    // Throws BadExpression for a format without an expression or a malformed expression.
    Qmx_CorrImplicitRelationship* CreateImplicitRelationship(
        Qmx_CorrContainer* src, Qmx_CorrContainer* dst, bool canCreateItems,
        Qmx_CorrImplicitRelationship::DIRECTION dir, const char* srcExpression,
        const char* dstFormat);
    // Writes item lists and pools out and unloads them; does not change IsModified.
    void FlushAll() const;
    bool IsModified() const;
    // Writable and with a file.
    bool CanCommit() const;
    // Throws DatabaseIsReadonly (with the database name) for a read-only database, and
    // without detail for one without a file; writes nothing when nothing was modified.
    void Commit() const;

    // The manager of the database that holds `object`; null for an object of another class.
    static const Qmx_CorrMgr* GetCorrMgrForObject(const Qmx_CorrObject* object);
    static Qmx_CorrMgr* GetCorrMgrForObject(Qmx_CorrObject* object);

    bool DbgValidateState() const;
    void DbgDump(std::ostream& out, unsigned indent) const;
    void DbgDump() const;

private:
    Qmx_CorrDataMgr* m_impl;  // owned
};

#endif
