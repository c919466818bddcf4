// Qmx_CorrName_Basic: the name record of Qmx_CorrNameRepo_Basic, which alone creates, changes
// and destroys it. It carries two counts that must not be confused:
//  - the reference count is the database's: how many objects, in memory or only in the
//    database, own the name. It is archived with every object record, and the table slot
//    of the name is freed when it falls to 0.
//  - the holder count says how many objects in memory hold this record object. The record is
//    destroyed when it falls to 0, so that one holder leaving memory never destroys the
//    record under another. A record with holder count 0 is the repository's permanent null
//    record, which is never counted and never destroyed through a handle.
#ifndef QMX_CORRNAME_BASIC_H
#define QMX_CORRNAME_BASIC_H
#include "Qmx_CorrName.h"

class Qmx_CorrNameRepo_Basic;

class QMX_CORR_EXPORT Qmx_CorrName_Basic final : public Qmx_CorrName {
public:
    ~Qmx_CorrName_Basic() override;
    Qmx_CorrName_Basic(const Qmx_CorrName_Basic&) = delete;
    Qmx_CorrName_Basic& operator=(const Qmx_CorrName_Basic&) = delete;

    unsigned int GetRefCount() const { return m_refCount; }
    // Position of the text in the repository's string table; 0 is the empty name.
    unsigned int GetIndex() const { return m_index; }
    unsigned int GetHolderCount() const { return m_holderCount; }
    // The repository that made the record; compared, never dereferenced.
    const Qmx_CorrNameRepo_Basic* GetRepository() const { return m_repository; }

private:
    friend class Qmx_CorrNameRepo_Basic;

    // One holder; holderCount 0 makes the permanent null record.
    Qmx_CorrName_Basic(const Qmx_CorrNameRepo_Basic* repository, unsigned int refCount,
                       unsigned int index, unsigned int holderCount = 1);

    unsigned int m_refCount;
    unsigned int m_index;
    unsigned int m_holderCount;
    const Qmx_CorrNameRepo_Basic* m_repository;  // not owned
};

#endif
