// ctest-label: threaded
#include "fleet/link/program/link_program.h"

#include <gtest/gtest.h>

#include <atomic>
#include <memory>
#include <optional>

#include "support/scratch_dir.h"

namespace {

using fleet::KeyKind;
using fleet::KeyPair;
using fleet::LinkProgram;

/// Forgets everything with the object.
class ShortMemory : public fleet::LinkMemory {
public:
    const KeyPair& bus() const override { return bus_; }
    const KeyPair& signing() const override { return signing_; }
    const std::string& token() const override { return token_; }
    const fleet::Kept& kept() const override { return kept_; }
    void keep(const fleet::Kept& kept) override { kept_ = kept; }

private:
    const KeyPair bus_ = KeyPair::make(KeyKind::User);
    const KeyPair signing_ = KeyPair::make(KeyKind::User);
    const std::string token_ = "a token";
    fleet::Kept kept_;
};

/// Counts how often it is asked what it is, and does nothing else.
class IdleHost : public fleet::HostSide {
public:
    IdleHost(Events events, std::atomic<int>& looks) : events_(std::move(events)), looks_(looks) {
        events_.isThere("a journal", {});
    }
    void handOver(const fleet::HandOver&, std::function<void(fleet::HandOverAnswer)>) override {}
    void enter(const fleet::EnterEnd&, std::function<void(fleet::HandOverAnswer)>) override {}
    void cancel(const std::string&, const std::string&,
                std::function<void(fleet::CancelAnswer)>) override {}
    void lookUp(const std::string&, const std::string&,
                std::function<void(fleet::LookUpAnswer)>) override {}
    void listOrders(const std::string&,
                    std::function<void(std::optional<std::vector<std::string>>)>) override {}
    void lookAgain() override {}
    void look(std::function<void(std::optional<fleet::HostLook>)> answer) override {
        ++looks_;
        answer(std::nullopt);
    }

private:
    const Events events_;
    std::atomic<int>& looks_;
};

class SharedLoop : public testing::Test {
protected:
    std::unique_ptr<LinkProgram> link() {
        fleet::LinkConfiguration configuration;
        configuration.fleet = "example";
        configuration.name = "web-1";
        configuration.bus = {"nats://127.0.0.1:1"};  // nobody listens there
        configuration.state = scratch_.path("");
        fleet::LinkParts parts;
        parts.memory = std::make_unique<ShortMemory>();
        parts.host = [this](fleet::HostSide::Events events) {
            return std::make_unique<IdleHost>(std::move(events), looks_);
        };
        parts.sharesThreads = true;
        parts.hasWork = [this] { ++letters_; };
        return std::make_unique<LinkProgram>(configuration, std::move(parts));
    }

    ScratchDir scratch_;
    std::atomic<int> looks_{0};
    std::atomic<int> letters_{0};
};

TEST_F(SharedLoop, HearsThatALinkHasSomethingToDoAndHasItDone) {
    const auto shared = link();
    EXPECT_GE(letters_, 1);  // the host is there
    EXPECT_EQ(looks_, 0);
    EXPECT_EQ(shared->work(), std::nullopt);
    EXPECT_EQ(looks_, 1);
}

TEST_F(SharedLoop, IsToldThatALinkHasEnded) {
    const auto shared = link();
    shared->end();
    EXPECT_EQ(shared->work(), LinkProgram::End::Asked);
    EXPECT_EQ(shared->work(), LinkProgram::End::Asked);
    EXPECT_EQ(looks_, 0);
}

}  // namespace
