/// A Unix stream socket in the file system that one process owns at a time.
#pragma once

#include <sys/types.h>

#include <string>

#include "system/file_descriptor.h"

namespace host {

/// Who else than this user and root could replace a socket at that path, because the directory is
/// his or lets him write, in words that name the directory; "" if nobody could, or if there is no
/// such directory. The sticky bit keeps others from replacing what is not theirs.
std::string folderFaultOf(const std::string& socketPath);

/// Who may connect to a socket.
enum class Connects {
    Owner,     ///< its owner and root
    Everybody  ///< all users; whoever accepts connections judges them
};

/// The same for a socket to which everybody may connect: there the sticky bit is not enough.
std::string sharedFolderFaultOf(const std::string& socketPath);

/// Binds a socket at a path, and removes it in the end.
///
/// The owner of a path holds a lock on the file PATH.lock beside it. So when two processes start at
/// once, they cannot both find a dead socket and replace it.
class SocketFile {
public:
    /// Binds with mode 0600, or 0666 for everybody. Replaces a socket that no process serves.
    /// Throws StartError when one does, when another kind of file stands there, when others could
    /// replace the socket, or when anything else fails. Nobody can connect before listen().
    explicit SocketFile(const std::string& path, Connects connects = Connects::Owner);
    /// Takes a listening socket that somebody else has bound at this path, such as a service
    /// manager, and leaves its file, with its mode, where it is. Throws StartError as above.
    SocketFile(const std::string& path, Connects connects, sys::FileDescriptor passed);
    ~SocketFile();
    SocketFile(const SocketFile&) = delete;
    SocketFile& operator=(const SocketFile&) = delete;

    /// Accepts connections from now on. Returns the descriptor: non-blocking, close-on-exec, owned
    /// by this object. Throws StartError.
    int listen();
    /// Gives up the path, and removes the socket unless another file has taken its place or
    /// somebody else has bound it.
    void remove();
    const std::string& path() const { return path_; }

private:
    void takePath();
    void replaceStale() const;
    void bind();

    const std::string path_;
    const Connects connects_;
    sys::FileDescriptor lock_;
    sys::FileDescriptor socket_;
    dev_t device_ = 0;
    ino_t inode_ = 0;
};

}  // namespace host
