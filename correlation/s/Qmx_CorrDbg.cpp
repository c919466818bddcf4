#include "Qmx_CorrDbg.h"

#include <cxxabi.h>

#include <cstdarg>
#include <cstdlib>
#include <cstring>
#include <iostream>

#include "Vesk_Env.h"
#include "Vesk_Fmt.h"
#include "Vesk_StringBase.h"

namespace Qmx_CorrDbg {

namespace {

constexpr std::size_t kBufferSize = 8192;
// The most spaces an indent may fill: the largest multiple of three below the buffer size.
constexpr std::uint32_t kMaxIndentSpaces = 2729 * 3;
constexpr const char* kTooLong = "ERROR: Formatted string too long.";

char g_dumpBuffer[kBufferSize];
char g_traceBuffer[kBufferSize];
unsigned g_initCounter = 0;

// Formats into one of the 8192-byte buffers; a text that does not fit whole is replaced, never
// cut.
void FormatInto(char* buffer, const char* format, std::va_list args) {
    const int needed = Vesk_Fmt::VFormat(buffer, kBufferSize, format, args);
    if (needed < 0 || static_cast<std::size_t>(needed) >= kBufferSize) {
        std::strcpy(buffer, kTooLong);
    }
}

void FillIndent(unsigned indent) {
    // Unsigned 32-bit arithmetic, as stored dumps were made with it.
    std::uint32_t spaces = static_cast<std::uint32_t>(indent) * 3u;
    if (spaces >= kBufferSize) spaces = kMaxIndentSpaces;
    std::memset(g_dumpBuffer, ' ', spaces);
    g_dumpBuffer[spaces] = '\0';
}

}  // namespace

Tracer* s_Tracer = nullptr;

Tracer::Tracer() : m_enabled(false), m_sourceLine(0), m_output(&std::clog) {
    ParseEnvironment();
    m_enabled = !m_levels.empty();
}

Tracer::~Tracer() = default;

void Tracer::ParseEnvironment() {
    const Vesk::StringBase<char> value = Vesk_Env::GetEnv("OBR_QMX_CORR_DBG_TRACE");
    Vesk::StringBase<char>::size_type pos = 0, start = 0, length = 0;
    while (value.NextTokenRange(";:", pos, start, length)) {
        ParseItem(value.substr(start, length));
    }
}

void Tracer::ParseItem(std::string text) {
    Vesk::StringBase<char> item = text;
    item.Trim();
    if (item.empty()) return;
    const std::size_t equals = item.GetIndexOfLastChar('=');
    if (equals == Vesk::StringBase<char>::npos) {
        *m_output << "Format of TRACE init variable is invalid. No trace level specified.\n"
                  << "Ignoring item: " << item << "\n";
        m_output->flush();
        return;
    }
    Vesk::StringBase<char> name = item.substr(0, equals);
    Vesk::StringBase<char> levelText = item.substr(equals + 1);
    name.Trim();
    levelText.Trim();
    std::uint32_t level = 0;
    if (!levelText.GetUINT32(level)) {
        *m_output << "Format of TRACE init variable is invalid. Invalid level specified.\n"
                  << "Ignoring item: " << item << "\n";
        m_output->flush();
        return;
    }
    if (name.CompareNoCase("all") == 0) name = "all";
    m_levels[name] = level;
    *m_output << "TRACE enabled: " << name << " = " << level << "\n";
}

void Tracer::SetTraceLevel(const char* category, unsigned level) {
    m_levels[category ? category : ""] = level;
    m_enabled = !m_levels.empty();
}

void Tracer::RemoveTrace(const char* category) {
    m_levels.erase(category ? category : "");
    m_enabled = !m_levels.empty();
}

bool Tracer::AllowTrace(const char* category, unsigned level) const {
    auto entry = m_levels.find(category ? category : "");
    if (entry == m_levels.end()) entry = m_levels.find("all");
    return entry != m_levels.end() && level <= entry->second;
}

void Tracer::SetSource(const char* sourceFile, std::uint32_t sourceLine) {
    m_sourceFile = sourceFile ? sourceFile : "";
    m_sourceLine = sourceLine;
}

void Tracer::TraceHead(const char* category, unsigned level) {
    *m_output << "QMX_CORR_TRACE:" << (category ? category : " ") << ":" << level << ":"
              << m_sourceFile << "(" << m_sourceLine << "): ";
}

void Tracer::TraceFormat(const char* format, ...) {
    std::va_list args;
    va_start(args, format);
    FormatInto(g_traceBuffer, format, args);
    va_end(args);
    *m_output << g_traceBuffer;
}

void Tracer::TraceTail() {
    *m_output << '\n';
    m_output->flush();
}

DbgTracerInitCounter::DbgTracerInitCounter() {
    if (g_initCounter++ == 0) s_Tracer = new Tracer();
}

DbgTracerInitCounter::~DbgTracerInitCounter() {
    if (--g_initCounter == 0) {
        delete s_Tracer;
        s_Tracer = nullptr;
    }
}

void Println(std::ostream& out, unsigned indent, const char* format, ...) {
    FillIndent(indent);
    out << g_dumpBuffer;
    std::va_list args;
    va_start(args, format);
    FormatInto(g_dumpBuffer, format, args);
    va_end(args);
    out << g_dumpBuffer << '\n';
    out.flush();
}

const char* GetIndentString(unsigned indent) {
    FillIndent(indent);
    return g_dumpBuffer;
}

void PrintEmptyBlock(std::ostream& out, unsigned indent, const std::string& head) {
    Println(out, indent, "%s", head.c_str());
    Println(out, indent, "{");
    Println(out, indent, "}");
}

std::string GetDumpName(const std::type_info& type) {
    int status = 0;
    char* readable = abi::__cxa_demangle(type.name(), nullptr, nullptr, &status);
    std::string name = status == 0 && readable ? readable : type.name();
    std::free(readable);
    return name;
}

const char* const Exception::s_dbg = g_dumpBuffer;

Exception::Exception(const char* sourceFile, std::uint32_t line, std::int32_t number)
    : m_sourceFile(sourceFile ? sourceFile : ""), m_line(line), m_number(number) {}

void Exception::Format(const char* format, ...) {
    std::va_list args;
    va_start(args, format);
    FormatInto(g_dumpBuffer, format, args);
    va_end(args);
}

std::ostream& operator<<(std::ostream& out, const Exception& exception) {
    out << "Qmx_CorrDbg::Exception: " << exception.GetSourceFile() << "(" << exception.GetLine()
        << "): [" << exception.GetNumber() << "] " << Exception::s_dbg << '\n';
    out.flush();
    return out;
}

}  // namespace Qmx_CorrDbg
