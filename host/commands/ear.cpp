#include "host/commands/ear.h"

#include <cstddef>
#include <iterator>
#include <new>
#include <string_view>

#include "host/commands/plugin_threads.h"
#include "host/commands/trace_texts.h"

namespace host {
namespace {

thread_local Recorder* current = nullptr;

class Ear final : public ras1::Listener {
public:
    void hear(const ras1::HeardLine& line) noexcept override {
        if (current == nullptr && !beginsCommand(line)) return;
        try {
            if (current == nullptr) current = PluginThreads::ofProcess().add();
        } catch (...) {
            return;  // no memory to remember anything in
        }
        current->hear(line);
    }

private:
    static bool beginsCommand(const ras1::HeardLine& line) {
        const std::string_view text(line.text, line.length);
        return std::string_view(line.unit) == trace::kRunnerUnit &&
               text.substr(0, trace::kCommand.size()) == trace::kCommand;
    }
};

}  // namespace

std::vector<ras1::HeardUnit> heardUnits() {
    return {{trace::kRunnerUnit, RAS1_DETAIL | RAS1_ERROR},
            {trace::kProcessUnit, RAS1_DETAIL | RAS1_ERROR},
            {trace::kAnswerUnit, RAS1_DETAIL},
            {trace::kInventoryUnit, RAS1_ERROR}};
}

void hearCommands() {
    // Never destroyed, because the plug-in's threads trace until the process ends.
    alignas(Ear) static unsigned char earPlace[sizeof(Ear)];
    alignas(ras1::Listening) static unsigned char place[sizeof(ras1::Listening)];
    [[maybe_unused]] static const auto& listening =
        *new (place) ras1::Listening(*new (earPlace) Ear, heardUnits());
}

ThreadEar::ThreadEar(std::size_t outputBytes) : recorder_(outputBytes) {
    current = &recorder_;
}

ThreadEar::~ThreadEar() {
    current = nullptr;
}

Heard takeOfPluginThread() {
    return current == nullptr ? Heard{} : current->take();
}

std::vector<Command> commandsOfPluginThreads() {
    std::vector<Command> found;
    for (const auto& recorder : PluginThreads::ofProcess().all()) {
        std::vector<Command> commands = recorder->commands();
        found.insert(found.end(), std::make_move_iterator(commands.begin()),
                     std::make_move_iterator(commands.end()));
    }
    return found;
}

}  // namespace host
