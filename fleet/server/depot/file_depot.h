/// Files on their way from operators to hosts.
#pragma once

#include <cstdint>
#include <mutex>
#include <optional>
#include <set>
#include <stdexcept>
#include <string>
#include <string_view>

#include "fleet/bus/messages/values.h"

namespace fleet {

/// Why a file is not taken; what() is for the operator.
class DepotError : public std::runtime_error {
public:
    enum class Kind {
        Wrong,  ///< what was sent is not what it was said to be
        Full,
        Failed  ///< the disk
    };
    DepotError(Kind kind, const std::string& text) : std::runtime_error(text), kind_(kind) {}
    Kind kind() const { return kind_; }

private:
    Kind kind_;
};

struct DepotLimits {
    std::uint64_t fileBytes = std::uint64_t{16} << 30;
    std::uint64_t allBytes = std::uint64_t{64} << 30;
    /// That stays free whatever comes, because the orders' database is on the disk, too: this share
    /// of the disk, and of a large one as many bytes.
    double freeShare = 0.2;
    std::uint64_t freeBytes = std::uint64_t{4} << 30;
    /// An order lives 7 days; a file that nobody has used for longer goes.
    Moment unusedTime = std::chrono::hours(24 * 8);
};

/// How far a file is.
struct DepotFile {
    std::uint64_t size = 0;
    std::uint64_t have = 0;  ///< bytes of it that are here
    bool isComplete() const { return have == size; }
};

/// A directory with a file for each sum. A file gets its name only when all of it is there,
/// durable, and has that sum; until then it stands in "SUM.SIZE.part", so an upload that was cut
/// off goes on where it was. Any thread. Throws DepotError.
class FileDepot {
public:
    /// Makes the directory with mode 0700.
    explicit FileDepot(std::string directory, DepotLimits limits = {});

    /// A file of that sum and size; nothing if not even a part of it is here.
    std::optional<DepotFile> find(const std::string& sum, std::uint64_t size) const;
    bool has(const std::string& sum) const;
    /// The same, and keeps it from being forgotten for as long as any order lives.
    bool noteUse(const std::string& sum) const;
    /// Takes a piece of a file that begins there. One that does not begin where the file ends now,
    /// or comes while another is being taken, changes nothing. Returns how far the file is then.
    /// When it is whole and has another sum, it is forgotten and this throws.
    DepotFile add(const std::string& sum, std::uint64_t size, std::uint64_t from,
                  std::string_view piece, Moment now);
    /// Bytes of a complete file; fewer at its end. Nothing if it is not there.
    std::optional<std::string> read(const std::string& sum, std::uint64_t from,
                                    std::size_t most) const;

private:
    std::string pathOf(const std::string& sum) const { return directory_ + '/' + sum; }
    std::string partOf(const std::string& sum, std::uint64_t size) const {
        return pathOf(sum) + '.' + std::to_string(size) + ".part";
    }
    void insistOnRoom(std::uint64_t more, std::uint64_t now) const;
    void forgetUnused(Moment now);
    DepotFile append(const std::string& sum, std::uint64_t size, std::uint64_t from,
                     std::string_view piece) const;
    void complete(const std::string& sum, std::uint64_t size) const;

    const std::string directory_;
    const DepotLimits limits_;
    mutable std::mutex mutex_;
    std::set<std::string> busy_;  ///< sums of which a piece is being taken
    Moment swept_{};
};

}  // namespace fleet
