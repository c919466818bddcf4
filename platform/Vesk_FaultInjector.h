// Vesk::FaultInjector: a test switch that makes the n-th file operation of the portability
// layer fail as if the operating system had refused it, so that tests can prove that every
// failure leaves committed data intact. Off unless armed; process-wide; one thread at a time.
#ifndef VESK_FAULTINJECTOR_H
#define VESK_FAULTINJECTOR_H
#include "VeskExport.h"

namespace Vesk {

class VESK_EXPORT FaultInjector {
public:
    enum Op { kOpen, kWrite, kFlush, kSync, kRename, kClose };

    // Starts counting operations from 0; the n-th from now (1-based) fails, and only that
    // one. n = 0 counts without failing.
    static void Arm(unsigned n);
    // Stops counting and failing.
    static void Disarm();
    // Operations counted since Arm.
    static unsigned Count();
    // Whether the armed failure has happened.
    static bool Fired();

    // Called by the layer before each operation: counts it; true when it must fail.
    static bool ShouldFail(Op op);
};

}  // namespace Vesk

#endif
