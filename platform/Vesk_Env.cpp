#include "Vesk_Env.h"

#include <cstdlib>

namespace Vesk_Env {

const char* GetEnv(const char* name) { return name ? std::getenv(name) : nullptr; }

}  // namespace Vesk_Env
