#include "host/process/options.h"

#include <CLI/CLI.hpp>
#include <filesystem>
#include <system_error>

#include "host/process/start_error.h"
#include "host/process/version.h"

namespace host {
namespace {

namespace fs = std::filesystem;

std::string valueOf(const Environment& environment, const char* name) {
    const char* value = environment(name);
    return value == nullptr ? "" : value;
}

std::string defaultSocket(const Environment& environment) {
    const std::string named = valueOf(environment, "ZAV_SOCKET");
    if (!named.empty()) return named;
    const std::string runtime = valueOf(environment, "XDG_RUNTIME_DIR");
    return (runtime.empty() ? "/run" : runtime) + "/zavhost.sock";
}

/// Children change their working directory, where a relative path would name something else.
std::string usableHome(const std::string& given, const Environment& environment) {
    const std::string home = given.empty() ? valueOf(environment, "TOVRINHOME") : given;
    if (home.empty()) throw StartError("no home: give --home DIR or set TOVRINHOME");
    std::error_code error;
    const fs::file_status status = fs::status(home, error);
    if (!fs::exists(status)) {
        throw StartError("home " + home + ": " +
                         (error ? error.message() : "no such file or directory"));
    }
    if (!fs::is_directory(status)) throw StartError("home " + home + " is not a directory");
    return fs::path(home).is_absolute() ? home : fs::absolute(home).string();
}

}  // namespace

std::optional<HostOptions> readOptions(int argc, const char* const* argv,
                                       const Environment& environment) {
    HostOptions options;
    bool unguarded = false;
    CLI::App app("A small agent process: loads the management plug-in and serves local clients",
                 "zavhost");
    app.set_version_flag("--version", kVersion);
    app.add_option("--home", options.home, "Home directory; else TOVRINHOME")->type_name("DIR");
    CLI::Option* socket =
        app.add_option("--socket", options.socket,
                       "Socket for HTTP; else ZAV_SOCKET, XDG_RUNTIME_DIR/zavhost.sock or "
                       "/run/zavhost.sock")
            ->type_name("PATH");
    CLI::Option* rpcSocket = app.add_option("--rpc-socket", options.rpcSocket,
                                            "Socket for file transfers; else the other's name "
                                            "with .rpc appended")
                                 ->type_name("PATH");
    app.add_option("--rpc-port", options.rpcPort, "Loopback TCP port for file transfers as well")
        ->type_name("N")
        ->check(CLI::Range(1, 65535));
    app.add_option("--origin-node", options.originNode,
                   "Name of the node that this host stands for")
        ->type_name("NAME");
    app.add_option("--plugin", options.plugin,
                   "The plug-in; else libzavmgmt.so in ../lib beside this program or where the "
                   "loader looks")
        ->type_name("FILE");
    app.add_flag("--unguarded", unguarded,
                 "Switch off every guard, so that the plug-in does exactly what it is told");
    try {
        app.parse(argc, argv);
    } catch (const CLI::Success& wanted) {
        app.exit(wanted);
        return std::nullopt;
    } catch (const CLI::ParseError& error) {
        throw StartError(std::string(error.what()) + " (--help shows the options)");
    }
    options.guarded = !unguarded;
    options.home = usableHome(options.home, environment);
    if (socket->empty()) options.socket = defaultSocket(environment);
    if (rpcSocket->empty()) options.rpcSocket = options.socket + ".rpc";
    if (options.socket.empty() || options.rpcSocket.empty()) {
        throw StartError("the name of a socket is empty");
    }
    if (options.socket == options.rpcSocket) {
        throw StartError("--socket and --rpc-socket name the same file " + options.socket);
    }
    return options;
}

}  // namespace host
