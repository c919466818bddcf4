// Gorsk::AccessMode: the bits of the access mode of every open in the repository component.
// Each kind of object takes its own subset; any other bit is refused with kBadRequest.
//
// | bit      | value | repository (IRepository::Open)     | storage (OpenStorage) | stream   |
// |----------|-------|------------------------------------|-----------------------|----------|
// | read     |     1 | required                           | required              | reads    |
// | write    |     2 | the file may be changed            | streams may be written| writes   |
// | create   |     8 | make a missing file (needs write)  | make a missing one    | -        |
// |          |       |                                    | (needs write)         |          |
// | truncate |    16 | -                                  | -                     | start    |
// |          |       |                                    |                       | empty    |
// |          |       |                                    |                       | (with    |
// |          |       |                                    |                       | write)   |
// | shared   |    32 | wait up to kBusyTimeoutMs for other| accepted, no effect   | -        |
// |          |       | clients' locks; without it the file|                       |          |
// |          |       | stays locked for this client alone |                       |          |
// |          |       | from its first use until Close     |                       |          |
//
// 43 (kAccessOpenShared = read + write + create + shared) is what a client that keeps its
// data in the repository passes for the repository and its storage: open both for reading and
// writing, make them when they are missing, and share the file with other clients. Streams
// take 1, 2 or 3, plus 16 with write.
#ifndef GORSK_ACCESSMODE_H
#define GORSK_ACCESSMODE_H

namespace Gorsk {

enum AccessMode : int {
    kAccessRead = 1,
    kAccessWrite = 2,
    kAccessCreate = 8,
    kAccessTruncate = 16,
    kAccessShared = 32,
    kAccessOpenShared = kAccessRead | kAccessWrite | kAccessCreate | kAccessShared,
};

}  // namespace Gorsk

#endif
