#include "request/clients.h"
#include "request/connection.h"

namespace request {

Exchange zabbix(std::uint16_t port, const std::string& command) {
    const std::string key = "system.run[" + command + "]";
    std::string request("ZBXD\1", 5);
    for (unsigned shift = 0; shift < 64; shift += 8)
        request += static_cast<char>(static_cast<std::uint64_t>(key.size()) >> shift & 0xFF);
    request += key;
    return [port, request] {
        Connection connection(port);
        connection.send(request);
        return connection.receiveAll();
    };
}

}  // namespace request
