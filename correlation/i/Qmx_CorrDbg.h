// Qmx_CorrDbg: the library's diagnostics.
//  - Tracer: the process-wide trace facility behind s_Tracer. A trace statement names a
//    category and a level; it is written only when the level set for its category (or, for a
//    category without an entry, the level of "all") is at least the statement's level. The
//    levels come from OBR_QMX_CORR_DBG_TRACE when the library is loaded, e.g.
//    "CORR_ALGO=10;POOL=5:all=1", and may be changed later. Records go to std::clog, one line
//    each: "QMX_CORR_TRACE:<category>:<level>:<file>(<line>): <message>".
//  - Println and GetIndentString: the line printer of every DbgDump (three spaces an indent).
//  - Exception: a small formatted debug record.
// No locking: the tracer's source position and the dump buffer are shared, so traces and
// dumps must not run in several threads at once.
#ifndef QMX_CORRDBG_H
#define QMX_CORRDBG_H
#include <cstdint>
#include <map>
#include <ostream>
#include <string>
#include <typeinfo>

#include "QmxCorrExport.h"
#include "VeskExport.h"

// The trace statement. `body` is a chain of stream insertions, e.g.
//     QMX_CORR_TRACE("ARCHIVE", 10, "Extracting stream '" << name << "'");
// Nothing of `body` is evaluated unless the record is allowed. The enclosing source file
// defines kSourceFile, the name the record carries.
#define QMX_CORR_TRACE(category, level, body)                                                \
    do {                                                                                     \
        Qmx_CorrDbg::Tracer* const qmxTracer = Qmx_CorrDbg::s_Tracer;                        \
        if (qmxTracer && qmxTracer->IsEnabled() && qmxTracer->AllowTrace(category, level)) { \
            qmxTracer->SetSource(kSourceFile, __LINE__);                                     \
            qmxTracer->TraceHead(category, level);                                           \
            qmxTracer->GetOutput() << body;                                                  \
            qmxTracer->TraceTail();                                                          \
        }                                                                                    \
    } while (0)

// The same with a printf-style body (formatted through TraceFormat).
#define QMX_CORR_TRACEF(category, level, ...)                                                \
    do {                                                                                     \
        Qmx_CorrDbg::Tracer* const qmxTracer = Qmx_CorrDbg::s_Tracer;                        \
        if (qmxTracer && qmxTracer->IsEnabled() && qmxTracer->AllowTrace(category, level)) { \
            qmxTracer->SetSource(kSourceFile, __LINE__);                                     \
            qmxTracer->TraceHead(category, level);                                           \
            qmxTracer->TraceFormat(__VA_ARGS__);                                             \
            qmxTracer->TraceTail();                                                          \
        }                                                                                    \
    } while (0)

namespace Qmx_CorrDbg {

class QMX_CORR_EXPORT Tracer {
public:
    // Reads and parses OBR_QMX_CORR_DBG_TRACE, reporting malformed items on std::clog.
    Tracer();
    ~Tracer();
    Tracer(const Tracer&) = delete;
    Tracer& operator=(const Tracer&) = delete;

    void SetTraceLevel(const char* category, unsigned level);
    // Erases the entry of exactly that name, if any.
    void RemoveTrace(const char* category);
    bool AllowTrace(const char* category, unsigned level) const;

    // The parts of one record; the trace statement macros call them in this order.
    void SetSource(const char* sourceFile, std::uint32_t sourceLine);
    void TraceHead(const char* category, unsigned level);
    // A text that would need 8192 bytes or more is replaced by
    // "ERROR: Formatted string too long.".
    void TraceFormat(const char* format, ...) VESK_PRINTF(2, 3);
    void TraceTail();

    // True exactly when some category has a level.
    bool IsEnabled() const { return m_enabled; }
    const std::map<std::string, std::uint32_t>& GetLevels() const { return m_levels; }
    std::ostream& GetOutput() const { return *m_output; }
    // Redirects records and messages (std::clog by default); the stream must outlive its use.
    void SetOutput(std::ostream& output) { m_output = &output; }

private:
    void ParseEnvironment();
    void ParseItem(std::string item);

    bool m_enabled;
    std::string m_sourceFile;
    std::uint32_t m_sourceLine;
    std::map<std::string, std::uint32_t> m_levels;  // byte-wise order; "all" is the fallback
    std::ostream* m_output;                         // not owned
};

// The one tracer of the process; null only before the library's static initialisation and
// after its finalisation.
QMX_CORR_EXPORT extern Tracer* s_Tracer;

// Counts the translation units that need the tracer: the first one constructed creates it,
// the last one destroyed deletes it. This header defines one per file that includes it.
class QMX_CORR_EXPORT DbgTracerInitCounter {
public:
    DbgTracerInitCounter();
    ~DbgTracerInitCounter();
};

// Writes indent x 3 spaces (8187 when that is 8192 or more), then the formatted text (or
// "ERROR: Formatted string too long." when it would need 8192 bytes or more), a newline, and
// flushes.
QMX_CORR_EXPORT void Println(std::ostream& out, unsigned indent, const char* format, ...)
    VESK_PRINTF(3, 4);
// The indent of Println as text, in the shared dump buffer (valid until the next dump call).
QMX_CORR_EXPORT const char* GetIndentString(unsigned indent);

// The dump of an object with nothing to show inside: `head`, "{", "}" through Println.
QMX_CORR_EXPORT void PrintEmptyBlock(std::ostream& out, unsigned indent, const std::string& head);

// The readable name of a class for dump head lines, e.g. "Qmx_CorrDb_Internal".
QMX_CORR_EXPORT std::string GetDumpName(const std::type_info& type);

// A debug record: where it was raised and a number; its text lives in the dump buffer.
class QMX_CORR_EXPORT Exception {
public:
    Exception(const char* sourceFile, std::uint32_t line, std::int32_t number);

    // Formats the record's text into the dump buffer (same limit as Println).
    static void Format(const char* format, ...) VESK_PRINTF(1, 2);
    // The dump buffer.
    static const char* const s_dbg;

    const char* GetSourceFile() const { return m_sourceFile; }
    std::uint32_t GetLine() const { return m_line; }
    std::int32_t GetNumber() const { return m_number; }

private:
    const char* m_sourceFile;
    std::uint32_t m_line;
    std::int32_t m_number;
};

// "Qmx_CorrDbg::Exception: <file>(<line>): [<number>] <text>", a newline, and a flush.
QMX_CORR_EXPORT std::ostream& operator<<(std::ostream& out, const Exception& exception);

}  // namespace Qmx_CorrDbg

namespace {
// Keeps the tracer alive for as long as this file's static objects may trace.
const Qmx_CorrDbg::DbgTracerInitCounter s_qmxDbgTracerInitCounter;
}  // namespace

#endif
