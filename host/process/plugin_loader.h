/// The management plug-in as the host sees it: a shared library with one start-up function.
#pragma once

#include <optional>
#include <string>
#include <vector>

namespace host {

/// A loaded plug-in. It is never unloaded, because its threads and tables live as long as the
/// process.
class Plugin {
public:
    /// Loads `file`, or libzavmgmt.so or libzavmgmt.so.1 from ../lib beside the executable, else
    /// from where the loader looks. Throws StartError when there is no such library, when it is of
    /// another version of the interface or when it lacks the start-up function.
    explicit Plugin(const std::optional<std::string>& file);

    /// Runs the start-up function and returns its status, 0 for success. Set TOVRINHOME before.
    int initialize() const { return start_(); }
    const std::string& file() const { return file_; }
    /// The name with the interface's version that the library gives itself, such as
    /// "libzavmgmt.so.1"; its file's name if it gives none.
    std::string libraryName() const;
    /// Those of the documented names that the library does not export.
    std::vector<std::string> missingExports() const;

private:
    std::string file_;
    void* library_ = nullptr;
    int (*start_)() = nullptr;
};

}  // namespace host
