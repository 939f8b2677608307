/// The environment that a child is to have, made before there is a child.
#pragma once

#include <vector>

namespace ZAV {

/// A list of "NAME=value" texts that follows putenv's rules. Borrows every text: the process's own
/// and those put in must stay until the child has been started.
class ChildEnvironment {
public:
    /// Starts with the texts of `base`, a list that ends in a null pointer, or null. Reads the list
    /// as getenv would, so nobody may change it at the same time.
    explicit ChildEnvironment(char* const* base);

    /// "NAME=value" takes the place of NAME's value or is added; "NAME" alone takes NAME out.
    void put(const char* setting);
    /// The value of `name`, or null.
    const char* find(const char* name) const;
    /// The texts, ending in a null pointer; valid until the next put.
    char* const* list() const { return entries_.data(); }

private:
    std::vector<char*> entries_;  // the last one is null
};

}  // namespace ZAV
