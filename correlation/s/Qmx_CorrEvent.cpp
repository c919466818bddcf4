#include "Qmx_CorrEvent.h"

namespace Qmx_CorrEvent {

Emitter1<Qmx_CorrMgr*>& GetCorrMgrDeletedEmitter() {
    static auto* emitter = new Emitter1<Qmx_CorrMgr*>();
    return *emitter;
}

Emitter1<Qmx_CorrContainer*>& GetCorrContainerDeletedEmitter() {
    static auto* emitter = new Emitter1<Qmx_CorrContainer*>();
    return *emitter;
}

}  // namespace Qmx_CorrEvent
