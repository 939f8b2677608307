/// A Unix stream socket in the file system, which belongs to one process at a time.
#pragma once

#include <sys/types.h>

#include <string>

#include "host/process/file_descriptor.h"

namespace host {

/// Binds a socket at a path and removes it again.
///
/// Two processes that start at once cannot both find a dead socket and replace it: who serves a
/// path holds a lock on the file PATH.lock beside it for as long as it lives.
class SocketFile {
public:
    /// Binds with mode 0600. A socket that nobody serves is replaced; one that is served, or
    /// another kind of file, is left alone and StartError thrown, as for any other failure.
    /// Nobody can connect before listen().
    explicit SocketFile(const std::string& path);
    ~SocketFile();
    SocketFile(const SocketFile&) = delete;
    SocketFile& operator=(const SocketFile&) = delete;

    /// Accepts connections from now on. Returns the descriptor: non-blocking, close-on-exec, owned
    /// by this object. Throws StartError.
    int listen();
    /// Removes the socket, unless another file has taken its place, and gives up the path.
    void remove();
    const std::string& path() const { return path_; }

private:
    void replaceStale() const;
    void bind();

    const std::string path_;
    FileDescriptor lock_;
    FileDescriptor socket_;
    dev_t device_ = 0;
    ino_t inode_ = 0;
};

}  // namespace host
