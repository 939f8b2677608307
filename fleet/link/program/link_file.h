/// The one file that a link keeps.
#pragma once

#include <string>

#include "fleet/link/program/link_memory.h"
#include "system/file_descriptor.h"

namespace fleet {

/// "link.json" in the link's directory, readable for its user only: who this host is, and what must
/// not be forgotten. Whoever has a copy of it can speak for the host.
class LinkFile : public LinkMemory {
public:
    /// Reads it, and holds the directory's lock as long as it lives. Throws FileError, also when
    /// another process has that.
    explicit LinkFile(const std::string& directory);

    /// Makes the file of a host that has just been enrolled: its keys and its token of the bus.
    /// Throws FileError, also when there is one.
    static void create(const std::string& directory, const KeyPair& bus, const KeyPair& signing,
                       const std::string& token);
    /// Throws FileError if the host whose directory this is has been enrolled.
    static void insistOnNone(const std::string& directory);

    const KeyPair& bus() const override { return bus_; }
    const KeyPair& signing() const override { return signing_; }
    const std::string& token() const override { return token_; }
    const Kept& kept() const override { return kept_; }
    void keep(const Kept& kept) override;

private:
    struct Content;
    LinkFile(std::string path, sys::FileDescriptor lock, Content content);
    static Content read(const std::string& path);

    const std::string path_;
    const sys::FileDescriptor lock_;
    const KeyPair bus_;
    const KeyPair signing_;
    const std::string token_;
    Kept kept_;
};

}  // namespace fleet
