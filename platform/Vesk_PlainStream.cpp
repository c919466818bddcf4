#include "Vesk_PlainStream.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "Vesk_FaultInjector.h"
#include "Vesk_Fmt.h"
#include "Vesk_IOException.h"

namespace Vesk {

PlainStream::PlainStream(std::FILE* file, const StringBase<char>& path, bool readable,
                         bool writable)
    : m_file(file),
      m_path(path),
      m_readable(readable),
      m_writable(writable),
      m_pos(0),
      m_size(0),
      m_lastOp(kNone) {
    struct stat info;
    if (::fstat(::fileno(m_file), &info) == 0) m_size = static_cast<std::int64_t>(info.st_size);
}

PlainStream::~PlainStream() { PlainStream::closefile(); }

void PlainStream::Fail(int line, const char* what) const {
    const std::string text =
        Vesk_Fmt::FormatString("%s '%s': %s", what, m_path.c_str(), std::strerror(errno));
    throw IOException(IOException::kSystemError, "platform/Vesk_PlainStream", line, text.c_str());
}

void PlainStream::SwitchTo(LastOp op) {
    if (m_lastOp != kNone && m_lastOp != op) {
        if (::fseeko(m_file, static_cast<off_t>(m_pos), SEEK_SET) != 0) {
            Fail(__LINE__, "Cannot position");
        }
    }
    m_lastOp = op;
}

std::size_t PlainStream::doRead(char* buffer, std::size_t count) {
    if (!m_readable || count == 0) return 0;
    SwitchTo(kReading);
    const std::size_t got = std::fread(buffer, 1, count, m_file);
    if (got < count && std::ferror(m_file)) Fail(__LINE__, "Cannot read");
    m_pos += static_cast<std::int64_t>(got);
    return got;
}

void PlainStream::doWrite(const char* buffer, std::size_t count) {
    if (count == 0) return;
    if (!m_writable) {
        throw IOException(IOException::kUnsupported, "platform/Vesk_PlainStream", __LINE__,
                          "Stream is not open for writing.");
    }
    SwitchTo(kWriting);
    if (FaultInjector::ShouldFail(FaultInjector::kWrite)) {
        errno = EIO;
        Fail(__LINE__, "Cannot write");
    }
    if (std::fwrite(buffer, 1, count, m_file) != count) Fail(__LINE__, "Cannot write");
    m_pos += static_cast<std::int64_t>(count);
    if (m_pos > m_size) m_size = m_pos;
}

void PlainStream::setfoffset(std::int64_t offset) {
    if (offset < 0) offset = 0;
    if (::fseeko(m_file, static_cast<off_t>(offset), SEEK_SET) != 0) {
        Fail(__LINE__, "Cannot position");
    }
    m_pos = offset;
    m_lastOp = kNone;
}

void PlainStream::seekend() {
    if (::fseeko(m_file, 0, SEEK_END) != 0) Fail(__LINE__, "Cannot position");
    const off_t end = ::ftello(m_file);
    if (end < 0) Fail(__LINE__, "Cannot position");
    m_pos = static_cast<std::int64_t>(end);
    m_size = m_pos;
    m_lastOp = kNone;
}

std::int64_t PlainStream::remaining() const { return m_size > m_pos ? m_size - m_pos : 0; }

void PlainStream::flush() {
    if (!m_file || !m_writable) return;
    if (FaultInjector::ShouldFail(FaultInjector::kFlush)) {
        errno = EIO;
        Fail(__LINE__, "Cannot flush");
    }
    if (std::fflush(m_file) != 0) Fail(__LINE__, "Cannot flush");
}

void PlainStream::sync() {
    flush();
    if (!m_file || !m_writable) return;
    if (FaultInjector::ShouldFail(FaultInjector::kSync)) {
        errno = EIO;
        Fail(__LINE__, "Cannot sync");
    }
    if (::fsync(::fileno(m_file)) != 0) Fail(__LINE__, "Cannot sync");
}

bool PlainStream::closefile() {
    if (!m_file) return true;
    const bool injected = m_writable && FaultInjector::ShouldFail(FaultInjector::kClose);
    const bool ok = std::fclose(m_file) == 0;
    m_file = nullptr;
    return ok && !injected;
}

}  // namespace Vesk
