/// A directory of a test's own, removed with everything in it when the test ends.
#pragma once

#include <sys/types.h>

#include <string>

class ScratchDir {
public:
    ScratchDir();
    ~ScratchDir();
    ScratchDir(const ScratchDir&) = delete;
    ScratchDir& operator=(const ScratchDir&) = delete;

    /// The directory, or the path of `relative` in it; no "/" at the end.
    std::string path(const std::string& relative = "") const;
    /// Makes a directory and those above it; returns its path.
    std::string makeDir(const std::string& relative) const;
    /// Writes a file, making the directories above it; returns its path.
    std::string write(const std::string& relative, const std::string& content,
                      mode_t mode = 0644) const;
    /// Writes an executable script whose body follows "#!/bin/sh"; returns its path.
    std::string script(const std::string& relative, const std::string& body) const;
    std::string read(const std::string& relative) const;
    bool exists(const std::string& relative) const;

private:
    std::string root_;
};
