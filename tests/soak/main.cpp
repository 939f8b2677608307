// zavsoak: a host under everything at once. scripts/soak.sh builds and runs it.

#include <signal.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <exception>
#include <random>
#include <string>

#include "soak/run.h"

namespace {

constexpr const char* kUsage =
    "zavsoak [--seed N] [--clients N] [--real-pace] [--host FILE] [--plugin FILE] [--keep] "
    "[MINUTES]\n";

extern "C" void onEndSignal(int) {
    soak::Run::interrupt();
}

struct Arguments {
    soak::Options options;
    bool keep = false;
    bool good = true;
};

Arguments readArguments(int argc, char** argv) {
    Arguments arguments;
    soak::Options& options = arguments.options;
    options.host = ZAV_BUILD_DIR "/bin/zavhost";
    options.plugin = ZAV_BUILD_DIR "/lib/soak_plugin.so";
    options.seed = std::random_device{}();
    for (int i = 1; i < argc; ++i) {
        const std::string word = argv[i];
        const char* const value = i + 1 < argc ? argv[i + 1] : nullptr;
        if (word == "--keep") {
            arguments.keep = true;
        } else if (word == "--real-pace") {
            options.plugin.clear();
        } else if (word.rfind("--", 0) != 0) {
            options.minutes = std::atof(argv[i]);
        } else if (value == nullptr) {
            arguments.good = false;
        } else {
            ++i;
            if (word == "--seed") {
                options.seed = std::strtoull(value, nullptr, 10);
            } else if (word == "--clients") {
                options.clients = std::strtoul(value, nullptr, 10);
            } else if (word == "--host") {
                options.host = value;
            } else if (word == "--plugin") {
                options.plugin = value;
            } else {
                arguments.good = false;
            }
        }
    }
    arguments.good = arguments.good && options.minutes > 0 && options.clients > 0;
    return arguments;
}

int soakAll(const Arguments& arguments) {
    const soak::SoakHome home;
    std::printf("zavsoak --seed %llu --clients %zu %g, in %s\n",
                static_cast<unsigned long long>(arguments.options.seed), arguments.options.clients,
                arguments.options.minutes, home.root().c_str());
    std::fflush(stdout);
    auto result = soak::Run::Result::Bad;
    try {
        result = soak::Run(arguments.options, home).toTheEnd();
    } catch (const std::exception& error) {
        std::printf("zavsoak: %s\n", error.what());
    }
    if (result == soak::Run::Result::Interrupted) std::printf("broken off\n");
    if (result != soak::Run::Result::Bad && !arguments.keep) {
        home.remove();
    } else {
        std::printf("kept: %s, the host's log is %s\n", home.root().c_str(),
                    home.log("host.trace").c_str());
    }
    return result == soak::Run::Result::Good ? 0 : 1;
}

}  // namespace

int main(int argc, char** argv) {
    const Arguments arguments = readArguments(argc, argv);
    if (!arguments.good) {
        std::fputs(kUsage, stderr);
        return 2;
    }
    struct sigaction action {};
    action.sa_handler = onEndSignal;
    for (const int signal : {SIGINT, SIGTERM, SIGHUP})
        ::sigaction(signal, &action, nullptr);
    return soakAll(arguments);
}
