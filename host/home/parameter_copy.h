/// A copy of the universal agent's start-up parameters, for as long as they may be rewritten.
///
/// The plug-in writes the new text beside the file, removes the file, and copies the text to the
/// file's name. A host that is killed in between leaves no file, or the beginning of one.
#pragma once

#include <string>
#include <string_view>

namespace host {

/// The file: config/.ConfigData/kumenv in the home.
std::string startUpParametersOf(const std::string& home);

/// Calls of one home's copy must not overlap. What fails is thrown as std::system_error.
class ParameterCopy {
public:
    explicit ParameterCopy(const std::string& home);

    const std::string& file() const { return file_; }

    /// Makes the copy what the file holds now, with its mode and owner. It is on the disk when this
    /// returns. Without a regular file there is no copy.
    void save() const;

    /// Makes sure that what the file holds now is on the disk, and removes the copy.
    void drop() const;

    /// Puts the copy in the place of the file if that is gone or cut off. Otherwise removes the
    /// copy. Returns whether the file was restored.
    bool restore() const;

private:
    void sync() const;

    const std::string folder_;
    const std::string file_;
    const std::string copy_;
};

/// Whether `now` is what is left of `before`, or of a rewriting of it, whose end is missing. The
/// plug-in's rewriting replaces lines of the form NAME|DATAPROVIDER|LIST| and drops empty lines. A
/// file that somebody has changed in another way is not cut off.
bool isCutOff(std::string_view now, std::string_view before);

}  // namespace host
