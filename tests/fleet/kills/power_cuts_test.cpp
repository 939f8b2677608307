// Cuts the power of the bus while roll-outs run: the server acknowledges what it has not synced
// yet, so after a cut it has older messages than it has told of. Its files of consumers it writes
// at other times, so they may be newer than the messages.
//
//   ZAV_FLEET_CUTS=20 ZAV_FLEET_SEED=17 tests/fleet/power_cuts.sh
//
// Without these variables it cuts three times, with a seed of its own, which is printed.

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/wait.h>

#include <cstdint>
#include <filesystem>
#include <iostream>
#include <random>
#include <string>
#include <thread>
#include <vector>

#include "crash/variable_or.h"
#include "tests/fleet/kills/harmed_fleet.h"

namespace {

namespace fs = std::filesystem;

class PowerCuts : public harmed_fleet::HarmedFleet {
protected:
    /// What a disk has on it now stays; a server that stands still writes nothing meanwhile.
    void syncMessages() {
        fleet_.bus().signal(SIGSTOP);
        siginfo_t stopped{};
        const auto bus = static_cast<id_t>(fleet_.bus().pid());
        ASSERT_EQ(::waitid(P_PID, bus, &stopped, WSTOPPED | WNOWAIT), 0);
        fs::remove_all(synced());
        for (const fs::path& messages : messageFolders()) {
            const fs::path copy = synced() / fs::relative(messages, store());
            fs::create_directories(copy.parent_path());
            fs::copy(messages, copy, fs::copy_options::recursive);
        }
        fleet_.bus().signal(SIGCONT);
    }
    /// The messages are those that were synced; all other files are the newest.
    void cutPower() {
        fleet_.endBus(SIGKILL);
        for (const fs::path& messages : messageFolders()) {
            const fs::path copy = synced() / fs::relative(messages, store());
            lost_ += bytesIn(messages) - bytesIn(copy);
            fs::remove_all(messages);
            fs::create_directories(messages);
            if (fs::exists(copy)) fs::copy(copy, messages, fs::copy_options::recursive);
        }
        fleet_.startBus();
    }

    /// Of messages that the bus had acknowledged, over all cuts.
    std::int64_t lost() const { return lost_; }

private:
    static std::int64_t bytesIn(const fs::path& folder) {
        std::int64_t bytes = 0;
        if (!fs::exists(folder)) return bytes;
        for (const fs::directory_entry& file : fs::directory_iterator(folder))
            bytes += static_cast<std::int64_t>(file.file_size());
        return bytes;
    }
    fs::path store() const {
        return fs::path(fleet_.directory().facts().busDirectory) / "jetstream";
    }
    fs::path synced() const { return fleet_.scratch().path("synced"); }
    std::vector<fs::path> messageFolders() const {
        std::vector<fs::path> folders;
        for (const fs::directory_entry& account : fs::directory_iterator(store())) {
            if (!fs::exists(account.path() / "streams")) continue;
            for (const fs::directory_entry& stream :
                 fs::directory_iterator(account.path() / "streams"))
                folders.push_back(stream.path() / "msgs");
        }
        return folders;
    }

    std::int64_t lost_ = 0;
};

TEST_F(PowerCuts, LoseNoOrderAndRepeatNone) {
    const unsigned cuts = variableOr("ZAV_FLEET_CUTS", 3);
    const unsigned seed = variableOr("ZAV_FLEET_SEED", std::random_device()());
    std::cout << cuts << " power cuts with the seed " << seed << std::endl;
    std::mt19937 random(seed);
    std::uniform_int_distribution<int> delays(0, 1500);
    const auto aMoment = [&] {  // it is the dice's
        std::this_thread::sleep_for(std::chrono::milliseconds(delays(random)));
    };
    for (unsigned i = 0; i < cuts; ++i) {
        beginRollout();
        if (HasFatalFailure()) return;
        aMoment();
        syncMessages();
        beginRollout();
        if (HasFatalFailure()) return;
        aMoment();
        cutPower();
    }
    std::cout << lost() << " bytes of messages were lost" << std::endl;
    EXPECT_GT(lost(), 0) << "nothing was tried";
    ASSERT_TRUE(awaitEnd(std::chrono::seconds(30 * cuts))) << whatIsOpen();
    EXPECT_THAT(faults(), testing::IsEmpty());
    const auto all = ends();
    for (const auto& [state, count] : all)
        std::cout << count << " are " << state << std::endl;
    EXPECT_GE(madeRollouts(), static_cast<std::int64_t>(2 * cuts));
    EXPECT_EQ(all.at("done"), madeRollouts() * harmed_fleet::kHosts);
    EXPECT_EQ(fleet_.centre().err().find("two outcomes"), std::string::npos);
}

}  // namespace
