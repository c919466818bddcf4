#include "Vesk_MsgManData.h"

#include <cstdarg>
#include <iostream>

#include "Vesk_Env.h"
#include "Vesk_Fmt.h"

namespace {

bool g_debugOutput = false;

void WriteToErrorStream(const std::string& text) {
    std::cerr << text;
    std::cerr.flush();
}

}  // namespace

Vesk_MsgManData::Vesk_MsgManData(const char* component, const char* sourceFile, int line,
                                 const char* revision)
    : m_component(component), m_sourceFile(sourceFile), m_line(line), m_revision(revision) {}

Vesk_MsgManData Vesk_MsgManData::createObject(const char* component, const char* sourceFile,
                                              int line, const char* revision) {
    return Vesk_MsgManData(component, sourceFile, line, revision);
}

void Vesk_MsgManData::issueError(const char* format, ...) const {
    std::va_list args;
    va_start(args, format);
    WriteToErrorStream(Vesk_Fmt::VFormatString(format, args));
    va_end(args);
}

void Vesk_MsgManData::debugStub(const char* format, ...) {
    if (!IsDebugOutputOn()) return;
    std::va_list args;
    va_start(args, format);
    WriteToErrorStream(Vesk_Fmt::VFormatString(format, args));
    va_end(args);
}

void Vesk_MsgManData::SetDebugOutput(bool on) { g_debugOutput = on; }

bool Vesk_MsgManData::IsDebugOutputOn() {
    return g_debugOutput || Vesk_Env::GetEnv("VESK_DEBUG_OUTPUT") != nullptr;
}
