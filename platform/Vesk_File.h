// Vesk::File: the file system as the system sees it. Static operations only; they report
// failure by their result and never throw, so that callers decide what a failure means.
#ifndef VESK_FILE_H
#define VESK_FILE_H
#include <cstdint>
#include <vector>

#include "VeskExport.h"
#include "Vesk_StringBase.h"

namespace Vesk {

class Stream;

class VESK_EXPORT File {
public:
    // Access values of open.
    static constexpr int kRead = 1;        // an existing file, from its start
    static constexpr int kWrite = 2;       // a new file, or the old one emptied
    static constexpr int kTruncate = 4;    // with kWrite: the same (writing always replaces)
    static constexpr int kCompressed = 8;  // writing: the compressed form
    static constexpr int kRaw = 16;        // reading: the bytes as stored, never decompressed

    // Opens `path`. Reading (kRead, with or without kCompressed) recognises the compressed
    // form by its magic number, so a file opens in whichever form it was written. Writing
    // (kWrite, 6, 10, 14) makes a new or emptied file, compressed with kCompressed. Read and
    // write together (3) opens an existing file for both, or, with `create`, makes it; the
    // compressed form cannot be read and written at once (11 and 15 give null). kRaw with
    // kRead reads the stored bytes of either form as they are. `create` has
    // no other effect. Returns null on any failure. The caller releases it with close.
    static Stream* open(const StringBase<char>& path, int access, bool create);
    // Completes and closes the stream and deletes it; false when completing it failed (the
    // bytes may not all have reached the file). A null stream is no error.
    static bool close(Stream* stream);

    static bool exist(const StringBase<char>& path);
    // Size in bytes, or -1 when the file cannot be examined.
    static std::int64_t getsize_noopen(const StringBase<char>& path);
    // Creates an empty file, or empties an existing one. False on failure.
    static bool touchfile(const StringBase<char>& path);

    // A fresh private directory (mode 0700), made atomically so that no other process can
    // claim it, inside `parent`, or inside $TMPDIR or /tmp when `parent` is null or empty.
    // Returns its path without a trailing "/", or the empty string on failure.
    static StringBase<char> tmpnam(const char* parent);
    // Releases a name made by tmpnam: removes the directory if it is empty.
    static void remtmpnam(const StringBase<char>& path);

    static bool isdir(const StringBase<char>& path);
    // Creates the directory (with `recursive`, its missing parents too). True when it exists
    // afterwards.
    static bool mkdir(const StringBase<char>& path, bool recursive);
    static bool canwrite_dir(const StringBase<char>& path);
    // Removes one file. True when it is gone afterwards (a missing file is no error).
    static bool remove_f(const StringBase<char>& path);
    // Removes a directory and everything in it, without following symbolic links.
    static bool remove_r(const StringBase<char>& path);
    // Sets the file's length (zero bytes appended when it grows), creating a missing file.
    // False on failure.
    static bool resize_f(const StringBase<char>& path, std::int64_t size);
    // Renames atomically, replacing `to`. False on failure.
    static bool rename_f(const StringBase<char>& from, const StringBase<char>& to);
    // Makes the entries of a directory durable (fsync of the directory).
    static bool sync_dir(const StringBase<char>& path);

    // The names of the regular files of a directory (no "." or ".."), sorted byte-wise so that
    // every listing of the same directory has the same order. Empty when it cannot be read.
    static std::vector<StringBase<char>> listdir(const StringBase<char>& path);
};

}  // namespace Vesk

#endif
