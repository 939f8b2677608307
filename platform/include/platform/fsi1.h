/// File services: directory listings.
#pragma once

#include <cstdint>

/// Result codes; any other non-zero code is an errno value (EIO in place of the one whose number
/// would read as the end of the list).
enum : int {
    FSI1_OK = 0,
    FSI1_END_OF_LIST = 9,
};

/// One entry of a directory.
struct FSI1_ENTRY {
    char path[4096];         ///< directory, "/" (one) and file name, 0-terminated
    std::int64_t timeStamp;  ///< last modification, seconds since the epoch
    bool isDirectory;        ///< true for directories; links are followed if they lead anywhere
};

/// An open listing; owned by the facility.
struct FSI1_LIST;

extern "C" {

/// Opens a listing of `directory`. On FSI1_OK the caller closes `*list` with FSI1_DeleteList; on any
/// other result it is null. EINVAL when `directory` is null.
int FSI1_NewList(const char* directory, FSI1_LIST** list);

/// Fetches the next entry, in no particular order; "." and ".." are left out, and so are entries
/// that vanish while the listing runs or whose path does not fit. FSI1_END_OF_LIST after the last
/// one, and again after that; EINVAL for a null handle. `*entry` is meaningful with FSI1_OK only.
int FSI1_FetchList(FSI1_LIST* list, FSI1_ENTRY* entry);

/// Closes a listing. The handle is gone whatever the result. EINVAL for a null handle.
int FSI1_DeleteList(FSI1_LIST* list);

}  // extern "C"
