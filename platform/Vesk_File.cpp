#include "Vesk_File.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include "Vesk_Env.h"
#include "Vesk_FaultInjector.h"
#include "Vesk_PlainStream.h"
#include "Vesk_ZstdReadStream.h"
#include "Vesk_ZstdWriteStream.h"

namespace Vesk {

namespace {

// Zstd frames start with 28 B5 2F FD; a plain database file starts with the length of its
// magic (10 00 00 00), so the two forms are never mistaken for each other.
bool StartsWithZstdMagic(std::FILE* file) {
    unsigned char head[4];
    const std::size_t got = std::fread(head, 1, sizeof head, file);
    std::rewind(file);
    return got == 4 && head[0] == 0x28 && head[1] == 0xB5 && head[2] == 0x2F && head[3] == 0xFD;
}

Stream* OpenForReading(const StringBase<char>& path, bool raw) {
    std::FILE* file = std::fopen(path.c_str(), "rb");
    if (!file) return nullptr;
    if (!raw && StartsWithZstdMagic(file)) return new ZstdReadStream(file, path);
    return new PlainStream(file, path, true, false);
}

Stream* OpenForWriting(const StringBase<char>& path, bool compressed) {
    std::FILE* file = std::fopen(path.c_str(), "wb");
    if (!file) return nullptr;
    if (compressed) return new ZstdWriteStream(file, path);
    return new PlainStream(file, path, false, true);
}

Stream* OpenForBoth(const StringBase<char>& path, bool create) {
    std::FILE* file = std::fopen(path.c_str(), "r+b");
    if (!file && create && errno == ENOENT) file = std::fopen(path.c_str(), "w+b");
    if (!file) return nullptr;
    return new PlainStream(file, path, true, true);
}

bool RemoveTree(const std::string& path) {
    struct stat info;
    if (::lstat(path.c_str(), &info) != 0) return errno == ENOENT;
    if (!S_ISDIR(info.st_mode)) return ::unlink(path.c_str()) == 0;
    DIR* dir = ::opendir(path.c_str());
    if (!dir) return false;
    bool ok = true;
    while (struct dirent* entry = ::readdir(dir)) {
        const char* name = entry->d_name;
        if (std::strcmp(name, ".") == 0 || std::strcmp(name, "..") == 0) continue;
        ok = RemoveTree(path + "/" + name) && ok;
    }
    ::closedir(dir);
    return ::rmdir(path.c_str()) == 0 && ok;
}

}  // namespace

Stream* File::open(const StringBase<char>& path, int access, bool create) {
    if (path.empty() || path.find('\0') != StringBase<char>::npos) return nullptr;
    if (FaultInjector::ShouldFail(FaultInjector::kOpen)) return nullptr;
    const bool read = (access & kRead) != 0;
    const bool write = (access & kWrite) != 0;
    const bool compressed = (access & kCompressed) != 0;
    if (read && write) return compressed ? nullptr : OpenForBoth(path, create);
    if (read) return OpenForReading(path, (access & kRaw) != 0);
    if (write) return OpenForWriting(path, compressed);
    return nullptr;
}

bool File::close(Stream* stream) {
    if (!stream) return true;
    const bool ok = stream->closefile();
    delete stream;
    return ok;
}

bool File::exist(const StringBase<char>& path) {
    struct stat info;
    return ::stat(path.c_str(), &info) == 0;
}

std::int64_t File::getsize_noopen(const StringBase<char>& path) {
    struct stat info;
    if (::stat(path.c_str(), &info) != 0) return -1;
    return static_cast<std::int64_t>(info.st_size);
}

bool File::touchfile(const StringBase<char>& path) {
    const int fd = ::open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0666);
    if (fd < 0) return false;
    return ::close(fd) == 0;
}

StringBase<char> File::tmpnam(const char* parent) {
    std::string base = parent && *parent ? parent : "";
    if (base.empty()) {
        const char* tmp = Vesk_Env::GetEnv("TMPDIR");
        base = tmp && *tmp ? tmp : "/tmp";
    }
    while (base.size() > 1 && base.back() == '/') base.pop_back();
    std::string pattern = base + "/vesk-XXXXXX";
    if (!::mkdtemp(&pattern[0])) return StringBase<char>();
    return StringBase<char>(pattern);
}

void File::remtmpnam(const StringBase<char>& path) { ::rmdir(path.c_str()); }

bool File::isdir(const StringBase<char>& path) {
    struct stat info;
    return ::stat(path.c_str(), &info) == 0 && S_ISDIR(info.st_mode);
}

bool File::mkdir(const StringBase<char>& path, bool recursive) {
    if (path.empty()) return false;
    if (isdir(path)) return true;
    if (recursive) {
        std::string trimmed = path;
        while (trimmed.size() > 1 && trimmed.back() == '/') trimmed.pop_back();
        const std::size_t slash = trimmed.rfind('/');
        if (slash != std::string::npos && slash > 0) mkdir(trimmed.substr(0, slash), true);
    }
    return ::mkdir(path.c_str(), 0777) == 0 || isdir(path);
}

bool File::canwrite_dir(const StringBase<char>& path) {
    return isdir(path) && ::access(path.c_str(), W_OK | X_OK) == 0;
}

bool File::remove_f(const StringBase<char>& path) {
    return ::unlink(path.c_str()) == 0 || errno == ENOENT;
}

bool File::remove_r(const StringBase<char>& path) {
    std::string trimmed = path;
    while (trimmed.size() > 1 && trimmed.back() == '/') trimmed.pop_back();
    return RemoveTree(trimmed);
}

bool File::resize_f(const StringBase<char>& path, std::int64_t size) {
    if (size < 0) return false;
    const int fd = ::open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0666);
    if (fd < 0) return false;
    const bool ok = ::ftruncate(fd, static_cast<off_t>(size)) == 0;
    return ::close(fd) == 0 && ok;
}

bool File::rename_f(const StringBase<char>& from, const StringBase<char>& to) {
    if (FaultInjector::ShouldFail(FaultInjector::kRename)) return false;
    return std::rename(from.c_str(), to.c_str()) == 0;
}

bool File::sync_dir(const StringBase<char>& path) {
    const int fd = ::open(path.empty() ? "." : path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (fd < 0) return false;
    const bool injected = FaultInjector::ShouldFail(FaultInjector::kSync);
    const bool ok = ::fsync(fd) == 0;
    ::close(fd);
    return ok && !injected;
}

std::vector<StringBase<char>> File::listdir(const StringBase<char>& path) {
    std::vector<StringBase<char>> names;
    DIR* dir = ::opendir(path.empty() ? "." : path.c_str());
    if (!dir) return names;
    std::string prefix = path;
    if (!prefix.empty() && prefix.back() != '/') prefix += '/';
    while (struct dirent* entry = ::readdir(dir)) {
        struct stat info;
        if (::lstat((prefix + entry->d_name).c_str(), &info) == 0 && S_ISREG(info.st_mode)) {
            names.emplace_back(entry->d_name);
        }
    }
    ::closedir(dir);
    std::sort(names.begin(), names.end(), [](const StringBase<char>& a, const StringBase<char>& b) {
        return a.Compare(b) < 0;
    });
    return names;
}

}  // namespace Vesk
