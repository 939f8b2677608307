/// A child's environment, built before the child exists.
#pragma once

#include <vector>

namespace ZAV {

/// A list of "NAME=value" texts that follows putenv's rules. Borrows every text: those of the
/// process and those passed to put must stay valid until the child has been started.
class ChildEnvironment {
public:
    /// Starts with the texts of `base`, which is null or a list that ends in a null pointer. Nobody
    /// may change that list meanwhile, as with getenv.
    explicit ChildEnvironment(char* const* base);

    /// "NAME=value" sets the variable; "NAME" alone removes it.
    void put(const char* setting);
    /// The value of `name`, or null.
    const char* find(const char* name) const;
    /// The texts, ending in a null pointer; valid until the next put.
    char* const* list() const { return entries_.data(); }

private:
    std::vector<char*> entries_;  // the last one is null
};

}  // namespace ZAV
