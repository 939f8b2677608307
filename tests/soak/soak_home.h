/// The home that a soaked host manages: small scripts that do as the product code, the target or
/// the install command says, and all too often not what is hoped for.
#pragma once

#include <string>

namespace soak {

// An instrumented host is slow to start children, all the more on a machine that is busy otherwise.
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr int kChildSeconds = 6;
#else
constexpr int kChildSeconds = 2;  ///< that the host lets a child run
#endif

/// Everything of one run lies below one directory, which stays until it is removed.
class SoakHome {
public:
    /// Makes the directory below the system's temporary directory, with the home in it.
    SoakHome();
    SoakHome(const SoakHome&) = delete;
    SoakHome& operator=(const SoakHome&) = delete;

    const std::string& root() const { return root_; }
    std::string home() const { return root_ + "/home"; }
    std::string depot() const { return root_ + "/depot"; }
    /// The host's directory for temporary files.
    std::string temporary() const { return root_ + "/tmp"; }
    std::string socket() const { return root_ + "/sockets/host.sock"; }
    std::string transferSocket() const { return socket() + ".rpc"; }
    std::string log(const std::string& name) const { return root_ + "/log/" + name; }

    /// A line per run of a start that writes itself down.
    std::string notes() const { return log("notes"); }

    /// Where all pushed files go, relative to the depot.
    static constexpr const char* kPushDirectory = "push";
    void removePushedFiles() const;
    void remove() const;

private:
    void writePrograms() const;
    void writeTranslator() const;
    void writeUniversalAgent() const;

    std::string root_;
};

/// A file's content; empty when it cannot be read.
std::string contentOf(const std::string& path);

}  // namespace soak
