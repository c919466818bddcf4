// Qmx_CorrPropertyRegistry: the restricted property names of the process and the accessor
// code each one demands. One instance lives from library load to unload; every object of every
// database consults it before it reads, writes or removes a property. The system's one
// restricted name, "Qmx_CorrMgrTest_Data", is entered at the first consultation. No locking.
#ifndef QMX_CORRPROPERTYREGISTRY_H
#define QMX_CORRPROPERTYREGISTRY_H
#include <iosfwd>

#include "QmxCorrExport.h"
#include "Qmx_CorrPropertyValue.h"

class QMX_CORR_EXPORT Qmx_CorrPropertyRegistry {
public:
    Qmx_CorrPropertyRegistry();
    virtual ~Qmx_CorrPropertyRegistry();

    // The process's registry.
    static Qmx_CorrPropertyRegistry& GetInstance();

    // An unrestricted name demands a null accessor; a restricted one a non-null accessor whose
    // bytes up to its NUL equal the registered code.
    bool IsProperAccessor(const Vesk::StringBase<char>& name, const char* accessor) const;

    bool DbgValidateState() const { return true; }
    void DbgDump(std::ostream& out, unsigned indent) const;
    void DbgDump() const;

private:
    // Restricted name to its accessor code. Filled lazily from a const operation, so mutable.
    mutable std::map<Vesk::StringBase<char>, Vesk::StringBase<char>, Qmx_CorrPropertyNameLess>
        m_restricted;
};

#endif
