// Qmx_CorrDataMgr: everything of one open database behind a Qmx_CorrMgr: the container tree,
// the implicit relationships, the pool managers of items and explicit relationships, the
// overflow-list managers, the shared-data managers and the name repository (its own unless the
// host passes one) and, for a database with a file, the archive. It is the one implementation
// of Qmx_CorrObjectOwner, through which every managed object creates, links and deletes
// others, and it keeps the modified flag: every change of the graph sets it, a commit clears
// it. Owned by its Qmx_CorrMgr. One thread at a time.
#ifndef QMX_CORRDATAMGR_H
#define QMX_CORRDATAMGR_H
#include <iosfwd>
#include <memory>
#include <vector>

#include "QmxCorrExport.h"
#include "Qmx_CorrImplicitRelationship.h"
#include "Qmx_CorrManagedExpRelMgr.h"
#include "Qmx_CorrManagedItemMgr.h"
#include "Qmx_CorrObjectOwner.h"
#include "Vesk_StringBase.h"

class Qmx_CorrArchive;
class Qmx_CorrMgr;

class QMX_CORR_EXPORT Qmx_CorrDataMgr : public Qmx_CorrObjectOwner {
public:
    // Closes without committing. The container tree goes first (its events see the whole
    // database), then the implicit relationships, the archive, the pool and overflow
    // managers, and last the owner's data managers and the database's own repository.
    ~Qmx_CorrDataMgr() override;

    void LinkRelationshipItem(Qmx_CorrExplicitRelationship* rel, Qmx_CorrItem* item,
                              unsigned end) override;
    void UnlinkRelationshipItem(Qmx_CorrExplicitRelationship* rel, Qmx_CorrItem* item,
                                unsigned end) override;
    void DeleteContainer(Qmx_CorrManagedContainer* container) override;
    void DeleteItem(Qmx_CorrManagedItem* item) override;
    void DeleteExplicitRelationship(Qmx_CorrManagedExplicitRelationship* rel) override;
    void DeleteImplicitRelationship(Qmx_CorrManagedImplicitRelationship* rel) override;
    Qmx_CorrManagedItem* CreateManagedItem(Qmx_CorrNameHandle name, Qmx_CorrContainer* parent,
                                           unsigned containerId) override;
    Qmx_CorrManagedItemMgr* GetManagedItemMgr() override { return m_itemMgr.get(); }
    Qmx_CorrDb* GetDatabase() override;
    const Qmx_CorrManagedItem* GetItemPtr(unsigned handle) const override;
    Qmx_CorrManagedItem* GetItemPtr(unsigned handle) override;
    unsigned GetItemHandle(const Qmx_CorrManagedItem* item) override;
    const Qmx_CorrManagedExplicitRelationship* GetExpRelPtr(unsigned handle) const override;
    Qmx_CorrManagedExplicitRelationship* GetExpRelPtr(unsigned handle) override;
    Qmx_CorrItemRelOverflowMgr* GetItemRelOverflowMgr() override { return m_itemRelOverflow.get(); }
    Qmx_CorrRelItemOverflowMgr* GetRelItemOverflowMgr() override { return m_relItemOverflow.get(); }
    void SetModified() override { m_modified = true; }
    // The tree and both pool managers valid; failures go to the message manager.
    virtual bool DbgValidateState() const;
    virtual void DbgDump(std::ostream& out, unsigned indent) const;
    virtual void DbgDump() const;

    // Opens the database file `dbName`, or none when it is empty. A missing file is created
    // and committed before the constructor returns, unless `readOnly`: a read-only database
    // whose file is missing is empty and has no file. `tempDir`, when not empty, is where the
    // database makes its own temporary directory; `repo` null gives the database a private
    // name repository. Errors of opening leave the constructor; nothing of it survives and
    // the file is left as it was.
    Qmx_CorrDataMgr(const Vesk::StringBase<char>& dbName, const Vesk::StringBase<char>& tempDir,
                    bool readOnly, Qmx_CorrNameRepository* repo);
    Qmx_CorrDataMgr(const Qmx_CorrDataMgr&) = delete;
    Qmx_CorrDataMgr& operator=(const Qmx_CorrDataMgr&) = delete;

    // Throws SrcAndDstIdentical when src and dst are the same pointer (two nulls included);
    // a null end makes a relationship without that side.
    Qmx_CorrManagedExplicitRelationship* CreateExplicitRelationship(Qmx_CorrItem* src,
                                                                    Qmx_CorrItem* dst);
    // Throws InvalidSrcItem / InvalidDstItem ("NULL") for a container that is not a managed
    // one, SrcAndDstIdentical for one container, BadExpression for a format without an
    // expression (short form) or a malformed expression (with it).
    Qmx_CorrManagedImplicitRelationship* CreateImplicitRelationship(
        Qmx_CorrContainer* src, Qmx_CorrContainer* dst, bool canCreateItems,
        Qmx_CorrImplicitRelationship::DIRECTION dir, const char* srcExpression,
        const char* dstFormat);

    // Writes the database when it is modified, writable and has a file; clears modified.
    // Without a file nothing happens.
    void Commit();
    // With a file: the containers' item lists, then every pool, written and unloaded.
    // Without a file nothing happens.
    void FlushAll();

    bool IsModified() const { return m_modified; }
    bool IsReadOnly() const { return m_readOnly; }
    const Vesk::StringBase<char>& GetDbName() const { return m_dbName; }
    Qmx_CorrManagedContainer* GetTopContainer() const { return m_top; }
    const std::vector<Qmx_CorrManagedImplicitRelationship*>& GetImplicitRelationships() const {
        return m_implicitRelationships;
    }
    Qmx_CorrManagedExpRelMgr* GetManagedExpRelMgr() { return m_expRelMgr.get(); }
    void SetCorrMgr(Qmx_CorrMgr* mgr) { m_corrMgr = mgr; }
    Qmx_CorrMgr* GetCorrMgr() const { return m_corrMgr; }

private:
    void Open();
    void TakeImplicitRelationships();
    // Everything in the order the destructor gives; also undoes a failed Open.
    void Close();
    // Items and relationships given by a host through the abstract interfaces.
    Qmx_CorrManagedItem* AsItem(Qmx_CorrItem* item) const;

    Qmx_CorrManagedContainer* m_top;                                            // owned
    std::vector<Qmx_CorrManagedImplicitRelationship*> m_implicitRelationships;  // owned
    Vesk::StringBase<char> m_dbName;
    Vesk::StringBase<char> m_tempDir;
    bool m_readOnly;
    bool m_modified;
    std::unique_ptr<Qmx_CorrArchive> m_archive;  // null without a file
    std::unique_ptr<Qmx_CorrManagedItemMgr> m_itemMgr;
    std::unique_ptr<Qmx_CorrManagedExpRelMgr> m_expRelMgr;
    Qmx_CorrMgr* m_corrMgr;  // not owned
    std::unique_ptr<Qmx_CorrItemRelOverflowMgr> m_itemRelOverflow;
    std::unique_ptr<Qmx_CorrRelItemOverflowMgr> m_relItemOverflow;
};

#endif
