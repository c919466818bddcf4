#include "Vesk_ZstdWriteStream.h"

#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "Vesk_FaultInjector.h"
#include "Vesk_Fmt.h"
#include "Vesk_IOException.h"

namespace Vesk {

namespace {

// The fastest level: the data is mostly names and handles, which compress well even so, and a
// commit must not wait for the compressor.
constexpr int kCompressionLevel = 1;

}  // namespace

ZstdWriteStream::ZstdWriteStream(std::FILE* file, const StringBase<char>& path)
    : m_file(file),
      m_path(path),
      m_context(ZSTD_createCCtx()),
      m_out(ZSTD_CStreamOutSize()),
      m_pos(0),
      m_finished(false) {
    ZSTD_CCtx_setParameter(m_context, ZSTD_c_compressionLevel, kCompressionLevel);
    ZSTD_CCtx_setParameter(m_context, ZSTD_c_checksumFlag, 1);
    m_in.reserve(ZSTD_CStreamInSize());
}

ZstdWriteStream::~ZstdWriteStream() {
    ZstdWriteStream::closefile();
    ZSTD_freeCCtx(m_context);
}

void ZstdWriteStream::Fail(int line, const char* what) const {
    const std::string text =
        Vesk_Fmt::FormatString("%s '%s': %s", what, m_path.c_str(), std::strerror(errno));
    throw IOException(IOException::kSystemError, "platform/Vesk_ZstdWriteStream", line,
                      text.c_str());
}

void ZstdWriteStream::WriteOut(std::size_t count) {
    if (count == 0) return;
    if (FaultInjector::ShouldFail(FaultInjector::kWrite)) {
        errno = EIO;
        Fail(__LINE__, "Cannot write");
    }
    if (std::fwrite(m_out.data(), 1, count, m_file) != count) Fail(__LINE__, "Cannot write");
}

void ZstdWriteStream::Drive(const char* buffer, std::size_t count, ZSTD_EndDirective mode) {
    ZSTD_inBuffer in{buffer, count, 0};
    for (;;) {
        ZSTD_outBuffer out{m_out.data(), m_out.size(), 0};
        const std::size_t left = ZSTD_compressStream2(m_context, &out, &in, mode);
        if (ZSTD_isError(left)) {
            errno = EINVAL;
            Fail(__LINE__, ZSTD_getErrorName(left));
        }
        WriteOut(out.pos);
        const bool done = mode == ZSTD_e_continue ? in.pos == in.size : left == 0;
        if (done) return;
    }
}

void ZstdWriteStream::DrainInput() {
    if (m_in.empty()) return;
    Drive(m_in.data(), m_in.size(), ZSTD_e_continue);
    m_in.clear();
}

std::size_t ZstdWriteStream::doRead(char*, std::size_t) { return 0; }

void ZstdWriteStream::doWrite(const char* buffer, std::size_t count) {
    if (count == 0) return;
    if (m_finished) {
        throw IOException(IOException::kUnsupported, "platform/Vesk_ZstdWriteStream", __LINE__,
                          "Write after the end of a compressed stream.");
    }
    if (m_in.size() + count > m_in.capacity()) DrainInput();
    if (count >= m_in.capacity()) {
        Drive(buffer, count, ZSTD_e_continue);
    } else {
        m_in.insert(m_in.end(), buffer, buffer + count);
    }
    m_pos += static_cast<std::int64_t>(count);
}

void ZstdWriteStream::setfoffset(std::int64_t offset) {
    if (offset != m_pos) {
        throw IOException(IOException::kUnsupported, "platform/Vesk_ZstdWriteStream", __LINE__,
                          "A compressed stream cannot be positioned while writing.");
    }
}

void ZstdWriteStream::flush() {
    if (!m_file) return;
    if (!m_finished) {
        DrainInput();
        Drive(nullptr, 0, ZSTD_e_flush);
    }
    if (FaultInjector::ShouldFail(FaultInjector::kFlush)) {
        errno = EIO;
        Fail(__LINE__, "Cannot flush");
    }
    if (std::fflush(m_file) != 0) Fail(__LINE__, "Cannot flush");
}

void ZstdWriteStream::finish() {
    if (!m_file) return;
    if (!m_finished) {
        DrainInput();
        Drive(nullptr, 0, ZSTD_e_end);
        m_finished = true;
    }
    flush();
}

void ZstdWriteStream::sync() {
    finish();
    if (FaultInjector::ShouldFail(FaultInjector::kSync)) {
        errno = EIO;
        Fail(__LINE__, "Cannot sync");
    }
    if (::fsync(::fileno(m_file)) != 0) Fail(__LINE__, "Cannot sync");
}

bool ZstdWriteStream::closefile() {
    if (!m_file) return true;
    bool ok = true;
    try {
        finish();
    } catch (const IOException&) {
        ok = false;
    }
    if (FaultInjector::ShouldFail(FaultInjector::kClose)) ok = false;
    if (std::fclose(m_file) != 0) ok = false;
    m_file = nullptr;
    return ok;
}

}  // namespace Vesk
