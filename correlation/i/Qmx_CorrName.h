// Qmx_CorrName: the abstract name record that a Qmx_CorrNameHandle points to. A name
// repository creates its records and alone knows what they hold; everyone else only passes
// handles around and asks the repository about them.
#ifndef QMX_CORRNAME_H
#define QMX_CORRNAME_H
#include "QmxCorrExport.h"

class QMX_CORR_EXPORT Qmx_CorrName {
public:
    virtual ~Qmx_CorrName();

protected:
    Qmx_CorrName() = default;
    Qmx_CorrName(const Qmx_CorrName&) = default;
    Qmx_CorrName& operator=(const Qmx_CorrName&) = default;
};

#endif
