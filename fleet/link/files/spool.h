/// Files on their way into the host's depot.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "fleet/bus/messages/values.h"

namespace fleet {

/// A directory with a file for each sum, readable for its owner only. A file has its name once all
/// of it is there and has that sum; until then it stands in "SUM.part", so that what was cut off
/// goes on. One thread at a time. Throws FileError.
class Spool {
public:
    /// Makes the directory, and forgets what was left for days.
    Spool(std::string directory, Moment now);

    std::string pathOf(const std::string& sum) const { return directory_ + '/' + sum; }
    bool has(const std::string& sum) const;
    /// How much of an incomplete file is there.
    std::uint64_t partOf(const std::string& sum) const;
    /// Whether so much more may be written: the disk has what the link must not forget.
    bool hasRoomFor(std::uint64_t bytes) const;
    /// Adds a piece at the part's end, or nothing of it.
    void append(const std::string& sum, std::string_view piece);
    /// The part is complete. False if it has another sum; then it is forgotten.
    bool complete(const std::string& sum);
    void forget(const std::string& sum);
    /// Forgets what was left for days, at most once an hour.
    void sweep(Moment now);

private:
    std::string partPath(const std::string& sum) const { return pathOf(sum) + ".part"; }
    void forgetOld(Moment now) const;

    const std::string directory_;
    Moment swept_{};
};

}  // namespace fleet
