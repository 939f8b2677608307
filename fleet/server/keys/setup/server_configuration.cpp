#include "fleet/server/keys/setup/server_configuration.h"

#include <filesystem>
#include <system_error>

#include "fleet/server/keys/files/keys_error.h"

namespace fleet {

std::string textOf(const ServerConfiguration& configuration, const FleetKeys& keys,
                   TokenTime issuedAt) {
    const std::string& directory = configuration.directory;
    const std::string certificate = directory + "/" + kBusServerFile;
    return "# A server of the fleet's bus. It listens for hosts and for the centre.\n"
           "listen: \"0.0.0.0:" +
           configuration.port +
           "\"\n"
           "jetstream {\n"
           "  store_dir: \"" +
           directory +
           "\"\n"
           "  # Below what the disk has: with a full one the server stops answering.\n"
           "  max_file_store: " +
           std::to_string(configuration.storeBytes) +
           "\n}\n"
           "tls {\n"
           "  cert_file: \"" +
           certificate + "\"\n  key_file: \"" + certificate +
           "\"\n"
           "  # Thousands of hosts may come back at once.\n"
           "  timeout: 30\n}\n" +
           accountsConfiguration(keys, directory + "/accounts", issuedAt);
}

std::uint64_t storeBytesFor(const std::string& directory) {
    namespace fs = std::filesystem;
    fs::path there = fs::absolute(directory);
    while (!fs::exists(there) && there.has_relative_path())
        there = there.parent_path();
    std::error_code error;
    const fs::space_info space = fs::space(there, error);
    if (error) throw KeysError("cannot tell how much is free in " + directory);
    return space.available / 5 * 4;
}

}  // namespace fleet
