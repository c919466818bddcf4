// Qmx_CorrRelationship: the common base of explicit and implicit relationships. It adds
// nothing to Qmx_CorrObject; its name is that of its shared data record.
#ifndef QMX_CORRRELATIONSHIP_H
#define QMX_CORRRELATIONSHIP_H
#include "QmxCorrExport.h"
#include "Qmx_CorrObject.h"

class QMX_CORR_EXPORT Qmx_CorrRelationship : public Qmx_CorrObject {
public:
    ~Qmx_CorrRelationship() override;
    Qmx_CorrRelationship() = default;
    Qmx_CorrRelationship(const Qmx_CorrRelationship&) = default;
    Qmx_CorrRelationship& operator=(const Qmx_CorrRelationship&) = default;
};

#endif
