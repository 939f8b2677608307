// A plug-in for tests of the host program. It has the two task tables and an executor: a request
// COMMAND = "WORK", PRODUCT = milliseconds is accepted, and when its turn comes the executor makes
// the file began-TRANSID in the home, sleeps, makes ended-TRANSID and publishes the outcome.
//
// MADE_UP_PLUGIN=empty registers nothing, MADE_UP_PLUGIN=status starts with status 7.

#include <unistd.h>

#include <condition_variable>
#include <cstdlib>
#include <deque>
#include <fstream>
#include <mutex>
#include <string>
#include <thread>

#include "host/made_up_table.h"

namespace {

struct Task {
    std::string transid;
    int milliseconds = 0;
};

std::vector<ColumnInfo> taskColumns() {
    return {{"transid", 0, 8, OXA_TYPE_CHARACTER},
            {"command", 8, 16, OXA_TYPE_CHARACTER},
            {"product", 24, 8, OXA_TYPE_CHARACTER},
            {"retval", 32, 4, OXA_TYPE_INTEGER}};
}

std::string taskRow(const std::string& transid) {
    return RowBuilder().text(transid, 8).text("WORK", 16).text("", 8).integer(0);
}

/// Everything lives as long as the process, as the executor does.
struct PlugIn {
    MadeUpTable requests{"KAGREQT", taskColumns()};
    MadeUpTable outcomes{"KAGDYST", taskColumns()};
    std::mutex lock;
    std::condition_variable changed;
    std::deque<Task> queue;

    int accept(rtoxa& request) {
        Task task;
        FLT1_FILTERINFO entry{};
        while (request.GetFilterInfo(&entry) == OXA_OK) {
            const std::string name = entry.columnName;
            if (name == "TRANSID") task.transid = entry.value;
            if (name == "PRODUCT") task.milliseconds = std::atoi(entry.value);
        }
        std::string row = taskRow(task.transid);
        request.InsertRow(row.data());
        const std::lock_guard<std::mutex> guard(lock);
        queue.push_back(task);
        changed.notify_one();
        return OXA_OK;
    }
    [[noreturn]] void execute() {
        const std::string home = std::getenv("TOVRINHOME");
        while (true) {
            std::unique_lock<std::mutex> guard(lock);
            changed.wait(guard, [this] { return !queue.empty(); });
            const Task task = queue.front();
            queue.pop_front();
            guard.unlock();
            std::ofstream(home + "/began-" + task.transid);
            ::usleep(static_cast<useconds_t>(task.milliseconds) * 1000);
            std::ofstream(home + "/ended-" + task.transid);
            outcomes.publish(taskRow(task.transid));
        }
    }
};

}  // namespace

extern "C" int Initialize_Mgmt_Functions() {
    const char* const mode = std::getenv("MADE_UP_PLUGIN");
    const std::string wanted = mode == nullptr ? "" : mode;
    if (wanted == "empty") return 0;
    static PlugIn& plugIn = *new PlugIn;
    plugIn.requests.sampler = [](rtoxa& request) { return plugIn.accept(request); };
    plugIn.requests.RegisterWithManager();
    plugIn.outcomes.RegisterWithManager();
    std::thread([] { plugIn.execute(); }).detach();
    return wanted == "status" ? 7 : 0;
}
