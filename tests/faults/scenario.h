/// Running a scenario again and again, each time with another of its calls failing.
#pragma once

#include <gmock/gmock.h>
#include <sys/wait.h>

#include <cerrno>
#include <functional>
#include <set>
#include <string>
#include <vector>

#include "base/zavstr.h"
#include "faults/fault_injection.h"
#include "support/process/child_role.h"
#include "support/trace_capture.h"

namespace faults {

inline std::string narrow(const ZAV::String& text) {
    return std::string(static_cast<const char*>(text.c_str()));
}

/// What a run ended in: its result in words, and the error lines that it traced.
struct End {
    std::string result;
    std::vector<std::string> errors;

    bool operator==(const End& other) const {
        return result == other.result && errors == other.errors;
    }
    friend std::ostream& operator<<(std::ostream& out, const End& end) {
        return out << end.result << ' ' << testing::PrintToString(end.errors);
    }
};

/// Expects at its end that no descriptor and no child is left.
class NothingLeft {
public:
    NothingLeft() = default;
    ~NothingLeft() {
        EXPECT_EQ(child_role::openDescriptors(), descriptors_);
        EXPECT_TRUE(::waitpid(-1, nullptr, WNOHANG) == -1 && errno == ECHILD);
    }
    NothingLeft(const NothingLeft&) = delete;
    NothingLeft& operator=(const NothingLeft&) = delete;

private:
    std::set<int> descriptors_ = child_role::openDescriptors();
};

class Scenario {
public:
    /// `prepare` makes the state that `run` begins with, without faults; `run` gives its result in
    /// words. `unharmed` is what a run without a fault ends in.
    Scenario(std::function<void()> prepare, std::function<std::string()> run, End unharmed)
        : prepare_(std::move(prepare)), run_(std::move(run)), unharmed_(std::move(unharmed)) {
        prepare_();
        runOnce();  // so that what is kept for good is there before anything is counted
    }

    const End& unharmed() const { return unharmed_; }

    /// The first call of that kind that fails ends in the first of `ends`, the second in the second
    /// and so on; there are no more such calls than that.
    void expectEach(Call call, int error, const std::vector<End>& ends) {
        for (std::size_t i = 0; i < ends.size(); ++i) {
            EXPECT_EQ(endWith(call, static_cast<int>(i) + 1, error), ends[i])
                << nameOf(call) << ' ' << i + 1;
            EXPECT_TRUE(happened_) << nameOf(call) << ' ' << i + 1;
        }
        EXPECT_EQ(endWith(call, static_cast<int>(ends.size()) + 1, error), unharmed_)
            << nameOf(call);
        EXPECT_FALSE(happened_) << "more calls of " << nameOf(call) << " than expected";
    }

    /// Whichever call of that kind fails, the run ends in one of `ends`; there is such a call.
    void expectAll(Call call, int error, const std::vector<End>& ends) {
        int nth = 0;
        do {
            ASSERT_LT(++nth, 2000) << nameOf(call);
            const End end = endWith(call, nth, error);
            EXPECT_THAT(happened_ ? ends : std::vector<End>{unharmed_}, testing::Contains(end))
                << nameOf(call) << ' ' << nth;
        } while (happened_);
        EXPECT_GT(nth, 1) << "no call of " << nameOf(call);
    }

    /// How a run ends whose `nth` call of that kind fails.
    End endWith(Call call, int nth, int error, Fault::Lasts lasts = Fault::Lasts::kOnce) {
        prepare_();
        const NothingLeft nothing;
        TraceCapture traces("ERROR");
        std::string result;
        {
            const Fault fault(call, nth, error, lasts);
            result = run_();
            happened_ = fault.happened();
        }
        return {result, traces.errors()};
    }

    /// How a run ends without a fault of its own making.
    End runOnce() {
        TraceCapture traces("ERROR");
        const std::string result = run_();
        return {result, traces.errors()};
    }

    void prepare() const { prepare_(); }
    /// Whether the last run has met its fault.
    bool happened() const { return happened_; }

private:
    std::function<void()> prepare_;
    std::function<std::string()> run_;
    End unharmed_;
    bool happened_ = false;
};

}  // namespace faults
