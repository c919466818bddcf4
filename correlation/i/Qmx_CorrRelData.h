// Qmx_CorrRelData: the shared data record of explicit and implicit relationships: the property
// map and the relationship's name, which is what GetName of a relationship returns. Records
// live in the database's Qmx_CorrRelDataMgr table.
//
// Record (after the property map record of Qmx_CorrObjectData): name, string.
#ifndef QMX_CORRRELDATA_H
#define QMX_CORRRELDATA_H
#include "QmxCorrExport.h"
#include "Qmx_CorrObjectData.h"
#include "Vesk_StringBase.h"

class QMX_CORR_EXPORT Qmx_CorrRelData : public Qmx_CorrObjectData {
public:
    Qmx_CorrRelData(Qmx_CorrObjectOwner* owner, const Vesk::StringBase<char>& name);
    // Reads the property map record, then the name.
    Qmx_CorrRelData(Qmx_CorrObjectOwner* owner, Qmx_CorrStorage& storage);
    ~Qmx_CorrRelData() override;

    const Vesk::StringBase<char>& GetName() const { return m_name; }
    void Archive(Qmx_CorrStorage& storage) const;

private:
    Vesk::StringBase<char> m_name;
};

#endif
