// Vesk::PlainStream: a Vesk::Stream over an uncompressed file (stdio-buffered). Made only by
// Vesk::File::open, which hands over the open FILE.
#ifndef VESK_PLAINSTREAM_H
#define VESK_PLAINSTREAM_H
#include <cstdio>

#include "Vesk_Stream.h"

namespace Vesk {

class PlainStream : public Stream {
public:
    // Takes ownership of `file`, positioned at its start.
    PlainStream(std::FILE* file, const StringBase<char>& path, bool readable, bool writable);
    ~PlainStream() override;

    std::int64_t getfoffset() const override { return m_pos; }
    void setfoffset(std::int64_t offset) override;
    void seekend() override;
    std::int64_t remaining() const override;
    bool iscompressed() const override { return false; }
    void flush() override;
    void finish() override { flush(); }
    void sync() override;

    bool closefile() override;

protected:
    std::size_t doRead(char* buffer, std::size_t count) override;
    void doWrite(const char* buffer, std::size_t count) override;

private:
    enum LastOp { kNone, kReading, kWriting };
    // stdio demands a seek between reading and writing on the same file.
    void SwitchTo(LastOp op);
    [[noreturn]] void Fail(int line, const char* what) const;

    std::FILE* m_file;        // owned
    StringBase<char> m_path;  // for messages
    bool m_readable;
    bool m_writable;
    std::int64_t m_pos;   // in bytes from the start
    std::int64_t m_size;  // of the file as far as this stream knows it
    LastOp m_lastOp;
};

}  // namespace Vesk

#endif
