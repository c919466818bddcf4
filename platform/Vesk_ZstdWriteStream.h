// Vesk::ZstdWriteStream: writes a file in the compressed form, one zstd frame with a checksum,
// in constant memory. The frame ends at finish (or when the stream is closed). Made only by
// Vesk::File::open.
#ifndef VESK_ZSTDWRITESTREAM_H
#define VESK_ZSTDWRITESTREAM_H
#include <zstd.h>

#include <cstdio>
#include <vector>

#include "Vesk_Stream.h"

namespace Vesk {

class ZstdWriteStream : public Stream {
public:
    // Takes ownership of `file`, empty and positioned at its start.
    ZstdWriteStream(std::FILE* file, const StringBase<char>& path);
    ~ZstdWriteStream() override;

    std::int64_t getfoffset() const override { return m_pos; }
    // Only the current position is accepted.
    void setfoffset(std::int64_t offset) override;
    void seekend() override {}
    std::int64_t remaining() const override { return 0; }
    bool iscompressed() const override { return true; }
    void flush() override;
    void finish() override;
    void sync() override;

    bool closefile() override;

protected:
    std::size_t doRead(char* buffer, std::size_t count) override;
    void doWrite(const char* buffer, std::size_t count) override;

private:
    // Runs the compressor with `mode` until it has nothing more to give.
    void Drive(const char* buffer, std::size_t count, ZSTD_EndDirective mode);
    // Hands the gathered input to the compressor.
    void DrainInput();
    void WriteOut(std::size_t count);
    [[noreturn]] void Fail(int line, const char* what) const;

    std::FILE* m_file;  // owned
    StringBase<char> m_path;
    ZSTD_CCtx* m_context;  // owned
    std::vector<char> m_out;
    // Callers write a few bytes at a time; the compressor is driven once per block.
    std::vector<char> m_in;
    std::int64_t m_pos;
    bool m_finished;
};

}  // namespace Vesk

#endif
