/// File services: directory listings.
#pragma once

#include <cstdint>

/// Result codes. Any other code is an errno value, with EIO in place of an errno that has the
/// number of FSI1_END_OF_LIST.
enum : int {
    FSI1_OK = 0,
    FSI1_END_OF_LIST = 9,
};

/// One entry of a directory.
struct FSI1_ENTRY {
    char path[4096];         ///< directory, one "/" and file name, 0-terminated
    std::int64_t timeStamp;  ///< last modification, seconds since the epoch
    bool isDirectory;        ///< symbolic links are followed unless they dangle
};

/// An open listing; owned by the platform.
struct FSI1_LIST;

extern "C" {

/// Opens a listing of `directory`. On FSI1_OK the caller closes `*list` with FSI1_DeleteList; on
/// any other result it is null. EINVAL when `directory` is null.
int FSI1_NewList(const char* directory, FSI1_LIST** list);

/// Fetches the next entry, in no particular order. Skips "." and "..", entries that vanish while
/// the listing runs and entries whose path does not fit. FSI1_END_OF_LIST after the last one, and
/// again after that; EINVAL for a null handle. `*entry` is meaningful with FSI1_OK only.
int FSI1_FetchList(FSI1_LIST* list, FSI1_ENTRY* entry);

/// Closes a listing. The handle is invalid afterwards, whatever the result. EINVAL for a null
/// handle.
int FSI1_DeleteList(FSI1_LIST* list);

}  // extern "C"
