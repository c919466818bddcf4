// Vesk_MsgManData: the message manager. An object made by createObject names where a message
// comes from; issueError sends an error text to the standard error stream. debugStub is debug
// output, written only while debug output is on (VESK_DEBUG_OUTPUT set, or SetDebugOutput),
// so that a library never chatters on a host's standard error in normal work.
#ifndef VESK_MSGMANDATA_H
#define VESK_MSGMANDATA_H
#include "VeskExport.h"
#include "Vesk_StringBase.h"

class VESK_EXPORT Vesk_MsgManData {
public:
    static Vesk_MsgManData createObject(const char* component, const char* sourceFile, int line,
                                        const char* revision);

    // Writes the formatted text, as it stands, to std::cerr and flushes.
    void issueError(const char* format, ...) const VESK_PRINTF(2, 3);

    static void debugStub(const char* format, ...) VESK_PRINTF(1, 2);
    static void SetDebugOutput(bool on);
    // True while debug output is on; the environment is looked at on each call.
    static bool IsDebugOutputOn();

    const Vesk::StringBase<char>& getComponent() const { return m_component; }
    const Vesk::StringBase<char>& getSourceFile() const { return m_sourceFile; }
    int getLine() const { return m_line; }

private:
    Vesk_MsgManData(const char* component, const char* sourceFile, int line, const char* revision);

    Vesk::StringBase<char> m_component;
    Vesk::StringBase<char> m_sourceFile;
    int m_line;
    Vesk::StringBase<char> m_revision;
};

#endif
