#include "Vesk_IOException.h"

namespace Vesk {

IOException::IOException(Kind kind, const char* sourceFile, int line, const char* description)
    : Exception("Vesk", sourceFile, "1", line, description), m_kind(kind) {}

}  // namespace Vesk
