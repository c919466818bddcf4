// Vesk::ZstdReadStream: reads the plain bytes of a file in the compressed form (zstd frames),
// sequentially, in constant memory. Damaged or cut-off data throws IOException(kDamagedData)
// instead of ending early. Made only by Vesk::File::open.
#ifndef VESK_ZSTDREADSTREAM_H
#define VESK_ZSTDREADSTREAM_H
#include <zstd.h>

#include <cstdio>
#include <vector>

#include "Vesk_Stream.h"

namespace Vesk {

class ZstdReadStream : public Stream {
public:
    // Takes ownership of `file`, positioned at its start.
    ZstdReadStream(std::FILE* file, const StringBase<char>& path);
    ~ZstdReadStream() override;

    std::int64_t getfoffset() const override { return m_pos; }
    // Forward only (the bytes in between are decoded and dropped).
    void setfoffset(std::int64_t offset) override;
    void seekend() override;
    std::int64_t remaining() const override { return -1; }
    bool iscompressed() const override { return true; }
    void flush() override {}
    void finish() override {}
    void sync() override {}

    bool closefile() override;

protected:
    std::size_t doRead(char* buffer, std::size_t count) override;
    void doWrite(const char* buffer, std::size_t count) override;

private:
    // Decodes more plain bytes into m_out; false at the clean end of the data.
    bool Refill();
    [[noreturn]] void Damaged(int line, const char* what) const;

    std::FILE* m_file;  // owned
    StringBase<char> m_path;
    ZSTD_DCtx* m_context;  // owned
    std::vector<char> m_in;
    ZSTD_inBuffer m_inBuffer;
    std::vector<char> m_out;
    std::size_t m_outStart;  // first plain byte of m_out not yet handed out
    std::size_t m_outEnd;
    std::size_t m_frameState;  // last result of ZSTD_decompressStream: 0 at a frame's end
    std::int64_t m_pos;
};

}  // namespace Vesk

#endif
