// Times requests to the host beside those to other programs that run a command when asked, all of
// which run the same script. They take turns, so that whatever else the machine does meets all of
// them alike. See request_bench.sh, which starts the servers.
//
//   request_bench --host SOCKET [--unguarded SOCKET] [--nrpe PORT] [--zabbix PORT] [--program
//   NAME=COMMAND-LINE]...
//                 --script PATH --expect TEXT [--rounds N] [--out FILE]
//
// The second host has its guards switched off. TEXT is what the script prints, or a part of it;
// every answer of a command must hold it. A command line is split at blanks. The medians are
// printed in microseconds; FILE takes them in seconds.

#include <CLI/CLI.hpp>
#include <cstdint>
#include <exception>
#include <iostream>
#include <string>
#include <vector>

#include "request/clients.h"
#include "request/turns.h"

namespace {

using request::Way;

struct Options {
    std::string host;
    std::string unguarded;
    std::uint16_t nrpe = 0;
    std::uint16_t zabbix = 0;
    std::vector<std::string> programs;
    std::string script;
    std::string expected;
    int rounds = 100;
    std::string out;
};

std::string requestQuery(const std::string& command) {
    return R"({"table": "KAGREQT", "where": [{"column": "COMMAND", "op": "=", "value": ")" +
           command +
           R"("}, {"column": "PRODUCT", "op": "=", "value": "ax"},)"
           R"( {"column": "TRANSID", "op": "=", "value": "bench"}]})";
}

void addHost(std::vector<Way>& ways, const std::string& name, const std::string& socket,
             const std::string& expected) {
    for (const bool keep : {true, false}) {
        const std::string suffix = keep ? "/kept" : "/anew";
        ways.push_back({name + "/getconfig" + suffix,
                        request::hostQuery(socket, requestQuery("GETCONFIG"), keep), expected});
        ways.push_back({name + "/inventory" + suffix,
                        request::hostQuery(socket, R"({"table": "KINAGT"})", keep), expected});
        ways.push_back({name + "/refused" + suffix,
                        request::hostQuery(socket, requestQuery("NOSUCH"), keep), "ZAV1006E"});
    }
}

std::vector<Way> waysOf(const Options& options) {
    std::vector<Way> ways;
    addHost(ways, "host", options.host, options.expected);
    if (options.nrpe != 0)
        ways.push_back({"nrpe", request::nrpe(options.nrpe, "script"), options.expected});
    if (options.zabbix != 0) {
        ways.push_back(
            {"zabbix", request::zabbix(options.zabbix, options.script), options.expected});
    }
    for (const std::string& named : options.programs)
        ways.push_back(request::programOf(named, options.expected));
    return ways;
}

/// Two hosts alone: what other programs leave in the processor's caches would be the larger part of
/// what they differ by.
std::vector<Way> waysOfHosts(const Options& options) {
    std::vector<Way> ways;
    if (options.unguarded.empty()) return ways;
    addHost(ways, "guarded", options.host, options.expected);
    addHost(ways, "unguarded", options.unguarded, options.expected);
    return ways;
}

}  // namespace

int main(int argc, char** argv) {
    Options options;
    CLI::App app;
    app.add_option("--host", options.host)->required();
    app.add_option("--unguarded", options.unguarded);
    app.add_option("--nrpe", options.nrpe);
    app.add_option("--zabbix", options.zabbix);
    app.add_option("--program", options.programs);
    app.add_option("--script", options.script)->required();
    app.add_option("--expect", options.expected)->required();
    app.add_option("--rounds", options.rounds)->check(CLI::PositiveNumber);
    app.add_option("--out", options.out);
    CLI11_PARSE(app, argc, argv);
    try {
        std::vector<Way> ways = waysOf(options);
        request::takeTurns(ways, options.rounds);
        request::report(ways, "request/", options.out);
        std::vector<Way> hosts = waysOfHosts(options);
        constexpr int kRoundsMore = 4;  // they differ by little, and take little time
        request::takeTurns(hosts, kRoundsMore * options.rounds);
        request::report(hosts, "request/", options.out);
    } catch (const std::exception& error) {
        std::cerr << "request_bench: " << error.what() << '\n';
        return 1;
    }
    return 0;
}
