// fleet_scale: measures fleets of several sizes on this machine.

#include <signal.h>

#include <cstdio>
#include <exception>
#include <filesystem>
#include <iostream>
#include <memory>
#include <optional>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include "tests/fleet/programs/process_figures.h"
#include "tests/fleet/scale/scale_table.h"
#include "tests/fleet/scale/simulated_fleet.h"

namespace fleet_scale {
namespace {

using fleet_programs::figuresOf;
using fleet_programs::JoinedHost;
using fleet_programs::ProcessFigures;
using fleet_programs::wallTime;
using std::chrono::milliseconds;
using std::chrono::minutes;
using std::chrono::seconds;

constexpr const char* kUsage =
    "usage: fleet_scale [--hosts N,N...] [--real M] [--task MILLISECONDS]\n"
    "\n"
    "Measures a fleet of each of these sizes, 1000,2500,5000,10000 if none is given, with M more\n"
    "real hosts. A task takes MILLISECONDS on a simulated host, 1000 if not given, as it does on\n"
    "a real one.\n";
constexpr minutes kMost{15};
constexpr seconds kRest{20};

struct Wish {
    std::vector<std::size_t> sizes = {1000, 2500, 5000, 10000};
    std::size_t real = 0;
    milliseconds taskTime{1000};
};

double secondsOf(fleet::Moment time) {
    return static_cast<double>(time.count()) / 1000;
}

/// One fleet.
class Measurement {
public:
    Measurement(const Wish& wish, std::size_t simulated, ScaleTable& table)
        : table_(table), fleet_(simulated, wish.taskTime), hosts_(simulated + wish.real) {
        insist(fleet_.awaitHeard(simulated, fleet_.began(), kMost), "not all hosts came");
        note("first connections: all hosts heard and their facts kept, s",
             secondsOf(wallTime() - fleet_.began()));
        for (std::size_t i = 0; i < wish.real; ++i) {
            real_.push_back(
                std::make_unique<JoinedHost>(fleet_.programs(), "real-" + std::to_string(i + 1)));
        }
        insist(fleet_.awaitHeard(hosts_, fleet_.began(), kMost), "not all real hosts came");
    }

    void run() {
        measureRest();
        measureStart();
        measureMemory();
        measureStorm();
        measureCentreRestart(SIGTERM, "centre restarted");
        measureCentreRestart(SIGKILL, "centre killed");
        note("peak memory of the server after all this, MiB", mebibytes(server().peakKiB));
        note("peak memory of the centre's last process, MiB", mebibytes(centre().peakKiB));
        insist(fleet_.endSimulator().find("ended:") == std::string::npos, "a link has ended");
    }

private:
    static void insist(bool holds, const char* what) {
        if (!holds) throw std::runtime_error(what);
    }
    static double mebibytes(long kibibytes) { return static_cast<double>(kibibytes) / 1024; }
    void note(const std::string& row, double figure, int decimals = 1) {
        table_.note(row, figure, decimals);
        std::cout << "  " << row << ": " << figure << std::endl;
    }
    ProcessFigures server() { return figuresOf(fleet_.programs().bus().pid()); }
    ProcessFigures centre() { return figuresOf(fleet_.programs().centre().pid()); }
    ProcessFigures simulator() { return figuresOf(fleet_.simulator().pid()); }

    /// What nothing but hellos costs.
    void measureRest() {
        const double serverBefore = server().processorSeconds;
        const double centreBefore = centre().processorSeconds;
        std::this_thread::sleep_for(kRest);  // the time is what is measured
        const auto share = [](double used) {
            return 100 * used / static_cast<double>(kRest.count());
        };
        note("server at rest, % of a processor", share(server().processorSeconds - serverBefore));
        note("centre at rest, % of a processor", share(centre().processorSeconds - centreBefore));
    }

    void measureStart() {
        const ProcessFigures before[] = {server(), centre(), simulator()};
        const fleet::Moment asked = wallTime();
        fleet_.startAll("ux");
        const fleet::Moment made = fleet_.records().newestRollout();
        note("zavctl: orders signed and at the centre, s", secondsOf(made - asked));
        const auto total = static_cast<std::int64_t>(hosts_);
        for (const int share : {50, 90, 99, 100}) {
            const std::int64_t wanted = (total * share + 99) / 100;
            insist(fleet_.awaitOver(wanted, kMost), "not all orders ended");
            note("START: " + std::to_string(share) + " % of the outcomes kept, s",
                 secondsOf(wallTime() - made));
        }
        note("START: processor time of the server, s",
             server().processorSeconds - before[0].processorSeconds);
        note("START: processor time of the centre, s",
             centre().processorSeconds - before[1].processorSeconds);
        note("START: processor time of all simulated hosts, s",
             simulator().processorSeconds - before[2].processorSeconds);
        for (const fleet_programs::RolledOut& one : fleet_.records().rolledOut())
            insist(one.orderState == "done", "an order did not end well");
    }

    void measureMemory() {
        note("memory of the server, MiB", mebibytes(server().residentKiB), 0);
        note("memory of the centre, MiB", mebibytes(centre().residentKiB), 0);
        note("memory of all simulated hosts, MiB", mebibytes(simulator().residentKiB), 0);
        note("threads of all simulated hosts", static_cast<double>(simulator().threads), 0);
        note("the bus's files, MiB", sizeOf(fleet_.programs().directory().facts().busDirectory));
        note("the centre's database, MiB", sizeOf(fleet_.programs().directory().orders()));
    }
    static double sizeOf(const std::string& directory) {
        std::uintmax_t bytes = 0;
        for (const auto& entry : std::filesystem::recursive_directory_iterator(directory)) {
            if (entry.is_regular_file()) bytes += entry.file_size();
        }
        return static_cast<double>(bytes) / (1 << 20);
    }

    void measureStorm() {
        fleet_.programs().endBus(SIGKILL);
        const fleet::Moment killed = wallTime();
        fleet_.programs().startBus();
        note("server killed: it is ready again, s", secondsOf(wallTime() - killed));
        insist(fleet_.awaitHeard(hosts_, killed, kMost), "not all hosts came back");
        note("server killed: all hosts heard again (TLS storm), s", secondsOf(wallTime() - killed));
        note("server killed: processor time of the new one, s", server().processorSeconds);
    }

    void measureCentreRestart(int signal, const std::string& what) {
        fleet_.programs().endCentre(signal);
        const fleet::Moment ended = wallTime();
        fleet_.programs().startCentre();
        fleet_.programs().awaitCentre();
        note(what + ": it works again, s", secondsOf(wallTime() - ended));
        insist(fleet_.awaitHeard(hosts_, ended, kMost), "not all hosts were heard again");
        note(what + ": all hosts heard again, s", secondsOf(wallTime() - ended));
    }

    ScaleTable& table_;
    SimulatedFleet fleet_;
    const std::size_t hosts_;
    std::vector<std::unique_ptr<JoinedHost>> real_;
};

std::vector<std::size_t> sizesIn(const std::string& text) {
    std::vector<std::size_t> sizes;
    for (std::size_t at = 0; at <= text.size();) {
        const std::size_t comma = std::min(text.find(',', at), text.size());
        sizes.push_back(std::stoul(text.substr(at, comma - at)));
        at = comma + 1;
    }
    return sizes;
}

/// Nothing if the arguments make no sense.
std::optional<Wish> wishOf(const std::vector<std::string>& words) {
    Wish wish;
    try {
        for (std::size_t i = 0; i < words.size(); i += 2) {
            const std::string& value = words.at(i + 1);
            if (words[i] == "--hosts") {
                wish.sizes = sizesIn(value);
            } else if (words[i] == "--real") {
                wish.real = std::stoul(value);
            } else if (words[i] == "--task") {
                wish.taskTime = milliseconds(std::stol(value));
            } else {
                return std::nullopt;
            }
        }
    } catch (const std::exception&) {
        return std::nullopt;
    }
    return wish;
}

void measure(const Wish& wish) {
    ScaleTable table;
    for (const std::size_t size : wish.sizes) {
        const std::string column =
            std::to_string(size) + (wish.real > 0 ? " + " + std::to_string(wish.real) : "");
        std::cout << column << " hosts" << std::endl;
        table.begin(column);
        Measurement(wish, size, table).run();
        // A larger one may not fit on this machine.
        std::cout << '\n' << table.text() << std::endl;
    }
}

}  // namespace
}  // namespace fleet_scale

int main(int argc, char** argv) {
    const auto wish = fleet_scale::wishOf({argv + 1, argv + argc});
    if (!wish) return std::fputs(fleet_scale::kUsage, stderr) < 0 ? 1 : 2;
    try {
        fleet_scale::measure(*wish);
        return 0;
    } catch (const std::exception& error) {
        std::cerr << "fleet_scale: " << error.what() << '\n';
        return 1;
    }
}
