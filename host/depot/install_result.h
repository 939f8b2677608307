/// What the script of an install that may restart the host leaves in the depot at its end.
#pragma once

#include <string>

namespace host {

/// Any thread.
class InstallResult {
public:
    enum class Content {
        Missing,  ///< the script has not come to its end
        Number,   ///< the install's exit status
        Other,    ///< anything else, which the plug-in would take for success
    };

    /// In this directory.
    explicit InstallResult(const std::string& depot);

    const std::string& path() const { return path_; }
    /// Opens no link and waits for no writer.
    Content look() const;
    /// Removes an older one, so that what is found later is the next install's. Returns false with
    /// errno set when there is something that cannot be removed.
    bool remove() const;

private:
    const std::string path_;
};

}  // namespace host
