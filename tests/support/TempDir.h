// TempDir: a private directory for one test, removed with everything in it at the end.
#ifndef QMX_TESTS_TEMPDIR_H
#define QMX_TESTS_TEMPDIR_H
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <string>

#include "Vesk_File.h"

class TempDir {
public:
    TempDir() : m_path(Vesk::File::tmpnam(nullptr)) {
        if (m_path.empty()) std::abort();
    }
    ~TempDir() { Vesk::File::remove_r(m_path); }
    TempDir(const TempDir&) = delete;
    TempDir& operator=(const TempDir&) = delete;

    const std::string& Path() const { return m_path; }
    std::string operator/(const std::string& name) const { return m_path + "/" + name; }

private:
    std::string m_path;
};

inline std::string ReadFileBytes(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    return std::string(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

inline void WriteFileBytes(const std::string& path, const std::string& bytes) {
    std::ofstream out(path, std::ios::binary | std::ios::trunc);
    out.write(bytes.data(), static_cast<std::streamsize>(bytes.size()));
}

#endif
