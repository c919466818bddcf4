#include "Vesk_FaultInjector.h"

namespace Vesk {

namespace {

bool g_armed = false;
unsigned g_failAt = 0;
unsigned g_count = 0;
bool g_fired = false;

}  // namespace

void FaultInjector::Arm(unsigned n) {
    g_armed = true;
    g_failAt = n;
    g_count = 0;
    g_fired = false;
}

void FaultInjector::Disarm() { g_armed = false; }

unsigned FaultInjector::Count() { return g_count; }

bool FaultInjector::Fired() { return g_fired; }

bool FaultInjector::ShouldFail(Op) {
    if (!g_armed) return false;
    ++g_count;
    if (g_count != g_failAt) return false;
    g_fired = true;
    return true;
}

}  // namespace Vesk
