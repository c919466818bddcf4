// GorskTest::IRecorder: the control side of the recording repository component, a stand-in
// for the real one that answers every repository, storage and stream call with success (or
// with kStoreError where a failure is asked for) and records each call as one line of text.
// Its repository, storage and stream are one object, shared by every database of the process.
#ifndef GORSKTEST_RECORDER_H
#define GORSKTEST_RECORDER_H
#include <string>
#include <vector>

#include "Gorsk_IObject.h"

namespace GorskTest {

constexpr const char* kRecorderId = "81bad6fe-e36f-416f-aa86-1072bc551887";
constexpr const char* kRecorderClassId = "27f184f7-5305-4326-96a7-b0e63e40f362";

class IRecorder : public Gorsk::IObject {
public:
    // The calls since the last TakeCalls or Reset, oldest first, e.g. "OpenStream info 18";
    // forgets them.
    virtual std::vector<std::string> TakeCalls() = 0;
    // From now on `call` fails: an operation ("Open", "OpenStorage", "OpenStream",
    // "CloseStream", "WriteUInt32", ...) returns kStoreError, an interface query ("IObject",
    // "IRepository", "IDisposable", "IRefCounted") gives null.
    virtual void Fail(const std::string& call) = 0;
    // Forgets the calls and the failures.
    virtual void Reset() = 0;

protected:
    ~IRecorder() override = default;
};

}  // namespace GorskTest

#endif
