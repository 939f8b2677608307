// ctest-label: threaded
#include "ctl/client/transfer/pusher.h"

#include <gtest/gtest.h>

#include <atomic>
#include <map>
#include <mutex>
#include <utility>
#include <vector>

#include "ctl/client/chunks.h"
#include "ctl/client/failure.h"
#include "ctl/client/transfer/made_up_host.h"
#include "support/scratch_dir.h"

namespace {

using ctl::ChunkBatch;
using ctl::PushedFile;
using ctl::Pusher;
using ctl_test::contentOf;
using ctl_test::HostConnection;
using ctl_test::MadeUpHost;
using ctl_test::pattern;

/// A depot in memory, for any number of connections.
class Depot {
public:
    /// Takes requests until the client ends the connection.
    void serve(HostConnection& connection, std::uint32_t status = 0) {
        connection.bind(65528);
        for (std::string data; !(data = connection.request()).empty();) {
            store(data);
            connection.answer(2, status);
        }
    }
    std::map<std::string, std::string> files() {
        const std::lock_guard<std::mutex> lock(mutex_);
        return files_;
    }

private:
    void store(const std::string& data) {
        const std::size_t length = ctl_test::numberAt(data, 4);
        const std::string name = data.substr(16, length - 1);
        const std::size_t fields = (16 + length + 3) / 4 * 4;
        const bool first = ctl_test::numberAt(data, fields + 4) == 1;
        const std::lock_guard<std::mutex> lock(mutex_);
        std::string& file = files_[name];
        if (first) file.clear();
        file += contentOf(data.substr(fields + 16));
    }

    std::mutex mutex_;
    std::map<std::string, std::string> files_;
};

class APusher : public testing::Test {
protected:
    /// Files with these contents, named after their number.
    std::vector<PushedFile> filesWith(const std::vector<std::string>& contents) const {
        std::vector<PushedFile> files;
        for (const std::string& content : contents) {
            const std::string name = std::to_string(files.size());
            files.push_back({scratch_.write(name, content), name, content.size(), 0, {}});
        }
        return files;
    }
    static void pushAll(const MadeUpHost& host, std::vector<PushedFile>& files) {
        Pusher pusher({"", host.path(), std::chrono::seconds(20)});
        for (PushedFile& file : files)
            pusher.push(file);
        pusher.finish();
    }
    static std::map<std::string, std::string> numbered(const std::vector<std::string>& contents) {
        std::map<std::string, std::string> files;
        for (const std::string& content : contents)
            files.emplace(std::to_string(files.size()), content);
        return files;
    }

    ScratchDir scratch_;
    Depot depot_;
};

TEST_F(APusher, SendsFilesOfAnySizeOverTwoAssociations) {
    std::vector<std::string> contents = {"", pattern(2 * ChunkBatch::kMostData + 1),
                                         pattern(ChunkBatch::kMostData), pattern(4096)};
    for (std::size_t i = 0; i < 200; ++i)
        contents.push_back(pattern(i * 50));
    std::vector<PushedFile> files = filesWith(contents);
    std::atomic<int> used{0};
    MadeUpHost host(
        [&](HostConnection& connection) {
            ++used;
            depot_.serve(connection);
        },
        2);
    pushAll(host, files);
    host.join();
    EXPECT_TRUE(depot_.files() == numbered(contents));
    EXPECT_EQ(used, 2);
    for (const PushedFile& file : files) {
        EXPECT_TRUE(file.wasTaken());
        EXPECT_EQ(file.sent, file.size);
    }
}

TEST_F(APusher, MakesDoWithOneAssociationWhenTheHostTakesNoOther) {
    const std::vector<std::string> contents(300, "text");
    std::vector<PushedFile> files = filesWith(contents);
    std::mutex mutex;
    bool isFirst = true;
    MadeUpHost host(
        [&](HostConnection& connection) {
            {
                const std::lock_guard<std::mutex> lock(mutex);
                if (!std::exchange(isFirst, false)) return;
            }
            depot_.serve(connection);
        },
        2);
    pushAll(host, files);
    host.join();
    EXPECT_EQ(depot_.files(), numbered(contents));
}

TEST_F(APusher, ReportsWhatTheHostSaysOfEachFile) {
    std::vector<PushedFile> files = filesWith({"a", "b", "c", pattern(3 * ChunkBatch::kMostData)});
    MadeUpHost host([&](HostConnection& connection) { depot_.serve(connection, 4); }, 2);
    pushAll(host, files);
    host.join();
    for (const PushedFile& file : files) {
        EXPECT_EQ(file.worst.status, 4);
        EXPECT_EQ(file.sent, 0U);
    }
    EXPECT_EQ(depot_.files()["3"].size(), ChunkBatch::kMostData) << "nothing is appended";
}

TEST_F(APusher, SumsWhatTheDepotShallHoldWhenAskedTo) {
    std::vector<PushedFile> files = filesWith({"abc",
                                               "a\r\nb\x1a"
                                               "c",
                                               ""});
    files[1].converted = true;
    MadeUpHost host([&](HostConnection& connection) { depot_.serve(connection); }, 2);
    {
        Pusher pusher({"", host.path(), std::chrono::seconds(20)}, {}, Pusher::Sums::Yes);
        for (PushedFile& file : files)
            pusher.push(file);
        pusher.finish();
    }
    host.join();
    EXPECT_EQ(files[0].sha256, "ba7816bf8f01cfea414140de5dae2223b00361a396177a9cb410ff61f20015ad");
    EXPECT_EQ(files[1].sha256, "b4c620724d95022be9765d6f660a36f90835acab2437b5e8cd71812940b29346");
    EXPECT_EQ(files[1].kept, 4U);
    EXPECT_EQ(files[2].sha256, "e3b0c44298fc1c149afbf4c8996fb92427ae41e4649b934ca495991b7852b855");
    for (const PushedFile& file : files)
        EXPECT_TRUE(file.isComplete());
}

TEST_F(APusher, TakesTheAnswersToWhatWasSentBeforeItWasAbandoned) {
    std::vector<PushedFile> files = filesWith({pattern(3 * ChunkBatch::kMostData), "held back"});
    MadeUpHost host([&](HostConnection& connection) { depot_.serve(connection); }, 1);
    Pusher pusher({"", host.path(), std::chrono::seconds(20)});
    pusher.push(files[0]);
    EXPECT_FALSE(files[0].isComplete()) << "only the first batch is waited for";
    pusher.push(files[1]);
    pusher.abandon();
    EXPECT_TRUE(files[0].isComplete());
    EXPECT_EQ(files[1].taken, 0U) << "a small file is held back until more come";
}

TEST_F(APusher, AFileThatCannotBeReadKeepsNoneBeforeItFromArriving) {
    std::vector<PushedFile> files = filesWith({"a", "b"});
    files.push_back({scratch_.path("none"), "none", 1, 0, {}});
    MadeUpHost host([&](HostConnection& connection) { depot_.serve(connection); }, 2);
    try {
        pushAll(host, files);
        FAIL();
    } catch (const ctl::Failure& failure) {
        EXPECT_EQ(failure.status(), ctl::kWrongUsage);
        EXPECT_EQ(failure.what(),
                  "cannot open " + scratch_.path("none") + ": No such file or directory");
    }
    host.join();
    EXPECT_EQ(depot_.files(), numbered({"a", "b"}));
}

}  // namespace
