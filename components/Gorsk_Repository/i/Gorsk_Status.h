// Gorsk::Status: the result of every operation of the repository component's interfaces. The
// component never lets an exception out to its clients; it answers with one of these.
#ifndef GORSK_STATUS_H
#define GORSK_STATUS_H

namespace Gorsk {

enum class Status : int {
    kOk = 0,
    // An open without the create bit (every open for reading only) found no repository,
    // storage or stream of that name.
    kNotFound = 1,
    // A read needs more bytes than are left in the stream. Nothing was consumed.
    kEndOfStream = 2,
    // The arguments or the call do not fit: a null out-pointer, an empty name, an access mode
    // that the object does not take, an object that this one did not hand out, a call on an
    // object that is not open, a read on a stream not open for reading.
    kBadRequest = 3,
    // A write asked of a repository, storage or stream opened for reading only.
    kReadOnly = 4,
    // The stream would grow past the largest one the repository keeps (Gorsk_IStream.h).
    // Nothing was written.
    kTooLarge = 5,
    // The file is not a repository, or one of a format version this component does not know.
    kInvalidFormat = 6,
    // The store failed: input or output error, disk full, or a lock held by another client
    // for longer than the busy timeout.
    kStoreError = 7,
};

}  // namespace Gorsk

#endif
