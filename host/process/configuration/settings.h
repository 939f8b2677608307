/// What was set, and where.
#pragma once

#include <map>
#include <optional>
#include <string>

namespace host {

/// The value of one option as it was written.
struct Setting {
    std::string text;  ///< "true" or "false" for a flag
    std::string file;  ///< the configuration file; "" if it stood on the command line
    int line = 0;      ///< its line in that file, from 1
};

/// Options by their names without dashes.
class Settings {
public:
    /// The first value of a name stays, so add the command line before the file.
    void add(const std::string& name, Setting setting);
    void add(const Settings& others);

    /// Null if the option was not set.
    const Setting* find(const std::string& name) const;
    std::optional<std::string> text(const std::string& name) const;
    bool flag(const std::string& name) const;

    /// What a complaint about the option begins with: "FILE:LINE: ", or "" if the file does not set
    /// it.
    std::string where(const std::string& name) const;
    /// What a complaint calls the option: "FILE:LINE: rpc-port" or "--rpc-port".
    std::string label(const std::string& name) const;
    /// Where it was set: "command line" or "FILE:LINE"; "" if it was not.
    std::string source(const std::string& name) const;

private:
    std::map<std::string, Setting> settings_;
};

}  // namespace host
