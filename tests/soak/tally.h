/// What has been done, and what has gone wrong.
#pragma once

#include <cstdint>
#include <map>
#include <string>
#include <vector>

namespace soak {

class Tally {
public:
    void count(const std::string& what, std::uint64_t times = 1) { counts_[what] += times; }
    std::uint64_t of(const std::string& what) const {
        const auto found = counts_.find(what);
        return found == counts_.end() ? 0 : found->second;
    }
    const std::map<std::string, std::uint64_t>& counts() const { return counts_; }

    /// Something that must not be. The first ones are kept in words.
    void fault(const std::string& text) {
        ++faultCount_;
        if (faults_.size() < kKept) faults_.push_back(text);
    }
    /// One that explains the others.
    void foremostFault(const std::string& text) {
        ++faultCount_;
        faults_.insert(faults_.begin(), text);
    }
    std::uint64_t faultCount() const { return faultCount_; }
    const std::vector<std::string>& faults() const { return faults_; }

private:
    static constexpr std::size_t kKept = 30;
    std::map<std::string, std::uint64_t> counts_;
    std::uint64_t faultCount_ = 0;
    std::vector<std::string> faults_;
};

}  // namespace soak
