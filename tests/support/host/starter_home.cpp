#include "support/host/starter_home.h"

#include <filesystem>
#include <stdexcept>
#include <vector>

namespace fs = std::filesystem;

StarterHome::StarterHome(const std::string& products) {
    const ProgramResult made = runProgram(
        {"/bin/sh", ZAV_SOURCE_DIR "/home/bin/prepare-home", path(), "--products", products});
    const std::string before = "home " + path() + " for ";
    if (made.status != 0 || made.out.rfind(before, 0) != 0) {
        throw std::runtime_error("the home cannot be made: " + made.out + made.err);
    }
    platform_ = made.out.substr(before.size(), made.out.find('\n') - before.size());
}

StarterHome::~StarterHome() {
    std::error_code error;
    std::vector<std::string> keys;
    for (const auto& entry : fs::directory_iterator(path("run"), error)) {
        if (entry.path().extension() == ".pid") keys.push_back(entry.path().stem().string());
    }
    for (const std::string& key : keys) {
        const std::size_t end = key.find('_');
        std::vector<std::string> argv = {path("bin/TovrinAgent"), "-h", path(), "-c"};
        if (end != std::string::npos) {
            argv.insert(argv.end(), {"-o", key.substr(end + 1)});
        }
        argv.insert(argv.end(), {"stop", key.substr(0, end)});
        try {
            runProgram(argv);
        } catch (const std::runtime_error&) {
            // The program has been taken away; so have the agents it would have stopped.
        }
    }
}

std::string StarterHome::path(const std::string& relative) const {
    return scratch_.path(relative.empty() ? "home" : "home/" + relative);
}

std::string StarterHome::makeBundle(const std::string& product,
                                    const std::string& destination) const {
    const ProgramResult made =
        runProgram({"/bin/sh", ZAV_SOURCE_DIR "/home/bundles/make-bundle", product, destination});
    if (made.status != 0) throw std::runtime_error("the bundle cannot be made: " + made.err);
    return made.out.substr(0, made.out.find('\n'));
}

bool StarterHome::runs(const std::string& key) const {
    return scratch_.exists("home/run/" + key + ".pid");
}
