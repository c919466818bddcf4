#include "Qmx_CorrPropertyRegistry.h"

#include <cstring>
#include <iostream>
#include <typeinfo>

#include "Qmx_CorrDbg.h"

namespace {

const char* const kRestrictedName = "Qmx_CorrMgrTest_Data";
const char* const kRestrictedCode = "kqzva";

// Set by the first consultation of any registry, as the restricted entry is entered once.
bool g_restrictedEntered = false;

Qmx_CorrPropertyRegistry g_registry;

}  // namespace

Qmx_CorrPropertyRegistry::Qmx_CorrPropertyRegistry() = default;
Qmx_CorrPropertyRegistry::~Qmx_CorrPropertyRegistry() = default;

Qmx_CorrPropertyRegistry& Qmx_CorrPropertyRegistry::GetInstance() { return g_registry; }

bool Qmx_CorrPropertyRegistry::IsProperAccessor(const Vesk::StringBase<char>& name,
                                                const char* accessor) const {
    if (!g_restrictedEntered) {
        m_restricted[kRestrictedName] = kRestrictedCode;
        g_restrictedEntered = true;
    }
    auto it = m_restricted.find(name);
    if (it == m_restricted.end()) return accessor == nullptr;
    // The code is compared up to the accessor's NUL, so a code with an embedded zero byte
    // could never be matched; none is registered.
    return accessor != nullptr && std::strcmp(accessor, it->second.c_str()) == 0;
}

void Qmx_CorrPropertyRegistry::DbgDump(std::ostream& out, unsigned indent) const {
    Qmx_CorrDbg::PrintEmptyBlock(out, indent,
                                 Qmx_CorrDbg::GetDumpName(typeid(Qmx_CorrPropertyRegistry)));
}

void Qmx_CorrPropertyRegistry::DbgDump() const { DbgDump(std::cerr, 0); }
