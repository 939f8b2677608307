/// Keeps secrets out of the log: texts that are a configuration as a whole, and what follows names
/// such as "password" and "=" or ":" in any other text. Both become "***".
///
/// Nothing here allocates, takes a lock or touches errno, so that a child may trace between vfork
/// and exec.
#pragma once

#include <cstddef>

#include "secrets/value_reader.h"

namespace ras1 {

/// What the log gets in place of one text.
class Masking {
public:
    /// Decides on the text, which is borrowed. Of each unit that writes configurations or output in
    /// pieces, the lines of a thread are to be shown in their order, exactly once.
    Masking(const char* unit, const char* text, std::size_t length);

    /// Whether the log gets something other than the text.
    bool changes() const { return changes_; }
    /// The length of what it gets then.
    std::size_t length() const { return length_; }
    /// Writes length() bytes.
    void put(char* out) const;

private:
    const char* const text_;
    const std::size_t textLength_;
    std::size_t shown_;          ///< as it is, at the beginning
    bool whole_ = false;         ///< the rest is secret as a whole
    secrets::Carried before_{};  ///< what preceded the rest
    bool changes_ = false;
    std::size_t length_ = 0;
};

}  // namespace ras1
