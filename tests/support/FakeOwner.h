// A database context for unit tests of the shared data: the owner's own fields and data
// managers are real; the object operations, which only the data manager provides, do nothing.
#ifndef QMX_TESTS_FAKEOWNER_H
#define QMX_TESTS_FAKEOWNER_H
#include <boost/shared_ptr.hpp>

#include "Qmx_CorrItemData.h"
#include "Qmx_CorrItemDataMgr.h"
#include "Qmx_CorrObject.h"
#include "Qmx_CorrObjectOwner.h"
#include "Qmx_CorrRelData.h"
#include "Qmx_CorrRelDataMgr.h"

namespace qmxtest {

class FakeOwner : public Qmx_CorrObjectOwner {
public:
    FakeOwner() = default;
    explicit FakeOwner(Qmx_CorrNameRepository* repo) : Qmx_CorrObjectOwner(repo) {}
    // As the data manager does: a later owner at the same address must not inherit this one's
    // default container record.
    ~FakeOwner() override { Qmx_CorrObjectData::ReleaseDefaultObjectData(this); }

    void LinkRelationshipItem(Qmx_CorrExplicitRelationship*, Qmx_CorrItem*, unsigned) override {}
    void UnlinkRelationshipItem(Qmx_CorrExplicitRelationship*, Qmx_CorrItem*, unsigned) override {}
    void DeleteContainer(Qmx_CorrManagedContainer*) override {}
    void DeleteItem(Qmx_CorrManagedItem*) override {}
    void DeleteExplicitRelationship(Qmx_CorrManagedExplicitRelationship*) override {}
    void DeleteImplicitRelationship(Qmx_CorrManagedImplicitRelationship*) override {}
    Qmx_CorrManagedItem* CreateManagedItem(Qmx_CorrNameHandle, Qmx_CorrContainer*,
                                           unsigned) override {
        return nullptr;
    }
    const Qmx_CorrManagedItem* GetItemPtr(unsigned) const override { return nullptr; }
    Qmx_CorrManagedItem* GetItemPtr(unsigned) override { return nullptr; }
    unsigned GetItemHandle(const Qmx_CorrManagedItem*) override { return 0; }
    const Qmx_CorrManagedExplicitRelationship* GetExpRelPtr(unsigned) const override {
        return nullptr;
    }
    Qmx_CorrManagedExplicitRelationship* GetExpRelPtr(unsigned) override { return nullptr; }
    Qmx_CorrItemRelOverflowMgr* GetItemRelOverflowMgr() override { return nullptr; }
    Qmx_CorrRelItemOverflowMgr* GetRelItemOverflowMgr() override { return nullptr; }
    void SetModified() override { ++modifiedCalls; }

    int modifiedCalls = 0;
};

// An item as far as its data goes: it holds one item record and makes it its own before a
// write exactly as a managed item does (table slot and item: two holders).
class DataItem : public Qmx_CorrObject {
public:
    DataItem(Qmx_CorrItemDataMgr& mgr, Qmx_CorrContainer* container, const char* name)
        : m_mgr(mgr), m_data(mgr.GetDefaultData(container)), m_name(name) {}
    ~DataItem() override = default;

    const Qmx_CorrObjectData* GetObjectData() const override { return m_data.get(); }
    Qmx_CorrObjectData* GetObjectDataForWrite() override {
        if (m_data.use_count() != 2) m_data = m_mgr.CreateData(m_data->GetContainer());
        return m_data.get();
    }
    Vesk::StringBase<char> GetName() const override { return m_name; }

    const boost::shared_ptr<Qmx_CorrItemData>& GetRecord() const { return m_data; }
    // What deleting the item does to its record.
    void Release() {
        m_mgr.ReleaseData(m_data);
        m_data.reset();
    }

private:
    Qmx_CorrItemDataMgr& m_mgr;
    boost::shared_ptr<Qmx_CorrItemData> m_data;
    Vesk::StringBase<char> m_name;
};

// A relationship as far as its data goes, with the same rule against the relationship table.
class DataRelationship : public Qmx_CorrObject {
public:
    explicit DataRelationship(Qmx_CorrRelDataMgr& mgr) : m_mgr(mgr), m_data(mgr.GetDefaultData()) {}
    ~DataRelationship() override = default;

    const Qmx_CorrObjectData* GetObjectData() const override { return m_data.get(); }
    Qmx_CorrObjectData* GetObjectDataForWrite() override {
        if (m_data.use_count() != 2) m_data = m_mgr.CreateData(m_data->GetName());
        return m_data.get();
    }
    Vesk::StringBase<char> GetName() const override { return m_data->GetName(); }

    const boost::shared_ptr<Qmx_CorrRelData>& GetRecord() const { return m_data; }
    void Release() {
        m_mgr.ReleaseData(m_data);
        m_data.reset();
    }

private:
    Qmx_CorrRelDataMgr& m_mgr;
    boost::shared_ptr<Qmx_CorrRelData> m_data;
};

}  // namespace qmxtest

#endif
