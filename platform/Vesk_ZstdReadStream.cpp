#include "Vesk_ZstdReadStream.h"

#include <algorithm>
#include <cstring>

#include "Vesk_Fmt.h"
#include "Vesk_IOException.h"

namespace Vesk {

ZstdReadStream::ZstdReadStream(std::FILE* file, const StringBase<char>& path)
    : m_file(file),
      m_path(path),
      m_context(ZSTD_createDCtx()),
      m_in(ZSTD_DStreamInSize()),
      m_inBuffer{m_in.data(), 0, 0},
      m_out(ZSTD_DStreamOutSize()),
      m_outStart(0),
      m_outEnd(0),
      m_frameState(0),
      m_pos(0) {}

ZstdReadStream::~ZstdReadStream() {
    ZstdReadStream::closefile();
    ZSTD_freeDCtx(m_context);
}

void ZstdReadStream::Damaged(int line, const char* what) const {
    const std::string text = Vesk_Fmt::FormatString("%s in '%s'.", what, m_path.c_str());
    throw IOException(IOException::kDamagedData, "platform/Vesk_ZstdReadStream", line,
                      text.c_str());
}

bool ZstdReadStream::Refill() {
    m_outStart = 0;
    m_outEnd = 0;
    while (m_outEnd == 0) {
        if (m_inBuffer.pos == m_inBuffer.size) {
            const std::size_t got = std::fread(m_in.data(), 1, m_in.size(), m_file);
            if (got == 0) {
                if (std::ferror(m_file)) Damaged(__LINE__, "Read error");
                // A frame that has not reached its end mark lost its tail.
                if (m_frameState != 0) Damaged(__LINE__, "Truncated compressed data");
                return false;
            }
            m_inBuffer = ZSTD_inBuffer{m_in.data(), got, 0};
        }
        ZSTD_outBuffer out{m_out.data(), m_out.size(), 0};
        const std::size_t result = ZSTD_decompressStream(m_context, &out, &m_inBuffer);
        if (ZSTD_isError(result)) Damaged(__LINE__, ZSTD_getErrorName(result));
        m_frameState = result;
        m_outEnd = out.pos;
    }
    return true;
}

std::size_t ZstdReadStream::doRead(char* buffer, std::size_t count) {
    std::size_t done = 0;
    while (done < count) {
        if (m_outStart == m_outEnd && !Refill()) break;
        const std::size_t piece = std::min(count - done, m_outEnd - m_outStart);
        std::memcpy(buffer + done, m_out.data() + m_outStart, piece);
        m_outStart += piece;
        done += piece;
    }
    m_pos += static_cast<std::int64_t>(done);
    return done;
}

void ZstdReadStream::doWrite(const char*, std::size_t) {
    throw IOException(IOException::kUnsupported, "platform/Vesk_ZstdReadStream", __LINE__,
                      "Stream is not open for writing.");
}

void ZstdReadStream::setfoffset(std::int64_t offset) {
    if (offset < m_pos) {
        throw IOException(IOException::kUnsupported, "platform/Vesk_ZstdReadStream", __LINE__,
                          "A compressed stream cannot move backwards.");
    }
    char scratch[4096];
    while (m_pos < offset) {
        const std::size_t want =
            static_cast<std::size_t>(std::min<std::int64_t>(offset - m_pos, sizeof scratch));
        if (doRead(scratch, want) == 0) break;
    }
}

void ZstdReadStream::seekend() {
    char scratch[4096];
    while (doRead(scratch, sizeof scratch) > 0) {
    }
}

bool ZstdReadStream::closefile() {
    if (!m_file) return true;
    const bool ok = std::fclose(m_file) == 0;
    m_file = nullptr;
    return ok;
}

}  // namespace Vesk
