// The recording repository component (Recorder.h). One object plays repository, storage and
// stream; reads give fixed values: byte 2, 32-bit 258, string "abc", 8 bytes left.
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "Gorsk_IDisposable.h"
#include "Gorsk_IRefCounted.h"
#include "Gorsk_IRepository.h"
#include "Gorsk_IStorage.h"
#include "Gorsk_IStream.h"
#include "Recorder.h"

namespace {

class RecordingRepository final : public Gorsk::IRepository,
                                  public Gorsk::IStorage,
                                  public Gorsk::IStream,
                                  public Gorsk::IDisposable,
                                  public Gorsk::IRefCounted,
                                  public GorskTest::IRecorder {
public:
    BrokI::IInterface* QueryInterface(const Vesk::ClassId& id) override {
        if (id == Vesk::ClassId(GorskTest::kRecorderId)) return AsRecorder();
        const std::pair<const char*, BrokI::IInterface*> known[] = {
            {Gorsk::kIObjectId, static_cast<Gorsk::IRepository*>(this)},
            {Gorsk::kIRepositoryId, static_cast<Gorsk::IRepository*>(this)},
            {Gorsk::kIDisposableId, static_cast<Gorsk::IDisposable*>(this)},
            {Gorsk::kIRefCountedId, static_cast<Gorsk::IRefCounted*>(this)},
        };
        const char* const names[] = {"IObject", "IRepository", "IDisposable", "IRefCounted"};
        for (std::size_t i = 0; i < 4; ++i) {
            if (id != Vesk::ClassId(known[i].first)) continue;
            Record(std::string("Query ") + names[i]);
            return Fails(names[i]) ? nullptr : known[i].second;
        }
        Record("Query " + id.GetText());
        return nullptr;
    }

    Gorsk::Status Open(const char* client, const Vesk::StringBase<char>& name, int mode,
                       Gorsk::IRepository** opened, unsigned int reserved) override {
        Record(std::string("Open ") + client + " " + name + " " + std::to_string(mode) + " " +
               std::to_string(reserved));
        *opened = Fails("Open") ? nullptr : this;
        return Result("Open");
    }
    Gorsk::Status Close() override { return Call("Close"); }
    Gorsk::Status OpenStorage(const Vesk::StringBase<char>& name, int mode,
                              Gorsk::IStorage** storage) override {
        Record("OpenStorage " + name + " " + std::to_string(mode));
        *storage = Fails("OpenStorage") ? nullptr : this;
        return Result("OpenStorage");
    }
    Gorsk::Status ReleaseStorage(Gorsk::IStorage*) override { return Call("ReleaseStorage"); }

    Gorsk::Status OpenStream(const Vesk::StringBase<char>& name, int mode,
                             Gorsk::IStream** stream) override {
        Record("OpenStream " + name + " " + std::to_string(mode));
        *stream = Fails("OpenStream") ? nullptr : this;
        return Result("OpenStream");
    }
    Gorsk::Status CloseStream(Gorsk::IStream*) override { return Call("CloseStream"); }

    Gorsk::Status ReadString(Vesk::StringBase<char>& text) override {
        text = "abc";
        return Call("ReadString");
    }
    Gorsk::Status WriteString(const Vesk::StringBase<char>& text) override {
        return Call("WriteString", text);
    }
    Gorsk::Status ReadByte(unsigned char& value) override {
        value = 2;
        return Call("ReadByte");
    }
    Gorsk::Status WriteByte(unsigned char value) override {
        return Call("WriteByte", std::to_string(value));
    }
    Gorsk::Status ReadUInt32(std::uint32_t& value) override {
        value = 258;
        return Call("ReadUInt32");
    }
    Gorsk::Status WriteUInt32(std::uint32_t value) override {
        return Call("WriteUInt32", std::to_string(value));
    }
    Gorsk::Status Flush() override { return Call("Flush"); }
    std::int64_t BytesLeft() const override {
        m_calls.push_back("BytesLeft");
        return 8;
    }

    void Dispose() override { Record("Dispose"); }
    unsigned int AddRef() override {
        Record("AddRef");
        return 1;
    }
    unsigned int Release() override {
        Record("Release");
        return 0;
    }

    std::vector<std::string> TakeCalls() override { return std::exchange(m_calls, {}); }
    void Fail(const std::string& call) override { m_failing.insert(call); }
    void Reset() override {
        m_calls.clear();
        m_failing.clear();
    }

    BrokI::IInterface* AsRepository() { return static_cast<Gorsk::IRepository*>(this); }
    BrokI::IInterface* AsRecorder() { return static_cast<GorskTest::IRecorder*>(this); }
    void Record(const std::string& call) { m_calls.push_back(call); }

private:
    bool Fails(const std::string& call) const { return m_failing.count(call) != 0; }
    Gorsk::Status Result(const std::string& call) const {
        return Fails(call) ? Gorsk::Status::kStoreError : Gorsk::Status::kOk;
    }
    Gorsk::Status Call(const std::string& call, const std::string& argument = std::string()) {
        Record(argument.empty() ? call : call + " " + argument);
        return Result(call);
    }

    mutable std::vector<std::string> m_calls;
    std::set<std::string> m_failing;
};

RecordingRepository& Instance() {
    static RecordingRepository instance;
    return instance;
}

}  // namespace

extern "C" __attribute__((visibility("default"))) BrokI::IInterface* BrokP_CreateInstance(
    const Vesk::ClassId* classId) {
    if (!classId) return nullptr;
    if (*classId == Vesk::ClassId(Gorsk::kRepositoryClassId)) {
        Instance().Record("CreateInstance");
        return Instance().AsRepository();
    }
    return *classId == Vesk::ClassId(GorskTest::kRecorderClassId) ? Instance().AsRecorder()
                                                                  : nullptr;
}
