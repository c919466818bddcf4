// Vesk_Env: the process environment.
#ifndef VESK_ENV_H
#define VESK_ENV_H
#include "VeskExport.h"

namespace Vesk_Env {

// The variable's text, or null when it is unset. The text stays valid until the environment
// changes.
VESK_EXPORT const char* GetEnv(const char* name);

}  // namespace Vesk_Env

#endif
