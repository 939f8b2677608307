/// A host with a depot of its own, and files to push into it.
#pragma once

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cstdint>
#include <filesystem>
#include <memory>
#include <nlohmann/json.hpp>
#include <random>

#include "support/host/managed_host.h"
#include "support/host/script_home.h"

/// Reproducible bytes without a pattern.
inline std::string randomBytes(std::size_t length, unsigned seed = 1) {
    std::mt19937_64 random(seed);
    std::string bytes((length + 7) / 8 * 8, '\0');
    for (std::size_t at = 0; at < bytes.size(); at += 8) {
        const std::uint64_t value = random();
        bytes.replace(at, 8, reinterpret_cast<const char*>(&value), 8);
    }
    bytes.resize(length);
    return bytes;
}

class PushFixture : public testing::Test {
protected:
    /// What zavctl sends in one call.
    static constexpr std::size_t kBatch = 250 * 4096;

    PushFixture() {
        home_.files().makeDir("home/tmp");
        files_.makeDir("depot");
    }

    /// Starts the host with the depot "depot", or with another one.
    void start(const std::vector<std::string>& moreArguments = {},
               const std::string& depot = "depot",
               ManagedHost::Guards guards = ManagedHost::Guards::Off) {
        host_ = std::make_unique<ManagedHost>(
            home_.path(), Environment{{"QVSDEPLOY_AGENTDEPOT", files_.path(depot)}}, moreArguments,
            guards);
    }

    static std::vector<std::string> pushArguments(const std::string& source,
                                                  const std::string& destination) {
        std::vector<std::string> arguments = {"push", source};
        if (!destination.empty()) arguments.push_back(destination);
        return arguments;
    }
    ProgramResult push(const std::string& source, const std::string& destination = "") const {
        return host_->zavctl(pushArguments(source, destination));
    }
    nlohmann::json pushJson(const std::string& source, const std::string& destination = "") const {
        std::vector<std::string> arguments = pushArguments(source, destination);
        arguments.insert(arguments.begin(), "--json");
        return nlohmann::json::parse(host_->zavctl(arguments).out, nullptr, false);
    }

    std::string depot(const std::string& relative) const {
        return files_.read("depot/" + relative);
    }
    bool inDepot(const std::string& relative) const { return files_.exists("depot/" + relative); }
    unsigned modeOf(const std::string& path) const {
        struct stat found {};
        return ::stat(path.c_str(), &found) == 0 ? found.st_mode & 07777U : 0;
    }
    /// Names of all files in the depot.
    std::vector<std::string> depotFiles() const {
        std::vector<std::string> names;
        const std::filesystem::path root = files_.path("depot");
        for (const auto& entry : std::filesystem::recursive_directory_iterator(root)) {
            if (entry.is_regular_file()) {
                names.push_back(entry.path().lexically_relative(root).generic_string());
            }
        }
        return names;
    }

    ScratchDir files_;
    ScriptHome home_;
    std::unique_ptr<ManagedHost> host_;
};
