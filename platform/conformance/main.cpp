// zavplatform-conformance: says, one line per operation of the seam, whether the platform that this
// program is linked with keeps what the operation promises.

#include <cstdio>
#include <exception>
#include <string>
#include <vector>

#include "conformance/run.h"

namespace {

constexpr const char* kUsage =
    "usage: zavplatform-conformance [--list] [OPERATION...]\n"
    "Checks the platform it is linked with. An OPERATION is a name as --list gives it, or the\n"
    "beginning of one; without any, all are checked. Ends with status 0 when every promise is\n"
    "kept, 1 when one is not, 2 on wrong usage or when the checks cannot be run.\n";

struct Request {
    bool list = false;
    std::vector<std::string> names;
};

bool parse(int argc, char** argv, Request& request) {
    for (int i = 1; i < argc; ++i) {
        const std::string argument = argv[i];
        if (argument == "--list") {
            request.list = true;
        } else if (!argument.empty() && argument[0] == '-') {
            return false;
        } else {
            request.names.push_back(argument);
        }
    }
    return true;
}

bool isWanted(const conformance::Operation& operation, const std::vector<std::string>& names) {
    if (names.empty()) return true;
    for (const std::string& name : names) {
        if (operation.name.compare(0, name.size(), name) == 0) return true;
    }
    return false;
}

std::vector<conformance::Operation> wantedOperations(const std::vector<std::string>& names) {
    std::vector<conformance::Operation> wanted;
    for (conformance::Operation& operation : conformance::allOperations()) {
        if (isWanted(operation, names)) wanted.push_back(std::move(operation));
    }
    return wanted;
}

int list(const std::vector<conformance::Operation>& operations) {
    for (const conformance::Operation& operation : operations) {
        for (const conformance::Rule& rule : operation.rules)
            std::printf("%s %s\n", operation.name.c_str(), rule.promise.c_str());
    }
    return 0;
}

int check(const std::vector<conformance::Operation>& operations) {
    std::size_t fulfilled = 0;
    for (const conformance::Operation& operation : operations) {
        const conformance::Verdict verdict = conformance::judge(operation);
        if (verdict.fulfilled) ++fulfilled;
        std::printf("%s\n", verdict.line.c_str());
        std::fflush(stdout);  // the next rule's child must not inherit what is still buffered
    }
    std::printf("%zu of %zu operations fulfilled\n", fulfilled, operations.size());
    return fulfilled == operations.size() ? 0 : 1;
}

}  // namespace

int main(int argc, char** argv) {
    try {
        Request request;
        const bool understood = parse(argc, argv, request);
        const std::vector<conformance::Operation> operations = wantedOperations(request.names);
        if (!understood || operations.empty()) {
            std::fputs(kUsage, stderr);
            return 2;
        }
        return request.list ? list(operations) : check(operations);
    } catch (const std::exception& failure) {
        std::fprintf(stderr, "zavplatform-conformance: %s\n", failure.what());
        return 2;
    }
}
