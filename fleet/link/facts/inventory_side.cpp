#include "fleet/link/facts/inventory_side.h"

#include <chrono>
#include <exception>
#include <nlohmann/json.hpp>
#include <utility>

#include "ctl/client/deadline.h"
#include "ctl/client/failure.h"
#include "ctl/client/host_client.h"
#include "ctl/client/instances.h"
#include "fleet/bus/messages/document.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr std::chrono::seconds kInventoryPatience{60};
constexpr const char* kProductColumns[] = {"PRODUCT",  "VERSION", "RELEASE", "PLATFORM",
                                           "HOSTTYPE", "HOSTPC",  "PRODDESC"};
constexpr std::size_t kMostWarnings = 20;
constexpr std::size_t kLongestWarning = 500;

/// The link ends.
struct LookEnds {};

json productsIn(const ctl::QueryAnswer& answer) {
    json products = json::array();
    for (const json& row : answer.rows) {
        json product = json::object();
        for (const char* const column : kProductColumns) {
            const auto found = row.find(column);
            if (found != row.end()) product[column] = *found;
        }
        products.push_back(std::move(product));
    }
    return products;
}

json warningsIn(const ctl::QueryAnswer& answer) {
    json warnings = json::array();
    for (const json& warning : answer.warnings) {
        const auto text = warning.is_object() ? warning.find("text") : warning.end();
        if (text == warning.end() || !text->is_string()) continue;
        if (warnings.size() == kMostWarnings) break;
        warnings.push_back(text->get<std::string>().substr(0, kLongestWarning));
    }
    return warnings;
}

}  // namespace

InventorySide::~InventorySide() {
    isEnding_ = true;
    worker_.await();
}

void InventorySide::look(std::function<void(std::optional<HostLook>)> answer) {
    worker_.add([this, answer = std::move(answer)] {
        std::optional<HostLook> look;
        try {
            look = lookNow();
        } catch (const LookEnds&) {
            return;
        } catch (const std::exception&) {
            // The host is away, or busy, or no host of this kind.
        }
        if (!isEnding_) answer(std::move(look));
    });
}

HostLook InventorySide::lookNow() const {
    const ctl::HostClient client(socket_);
    const ctl::Deadline deadline = ctl::deadlineIn(kInventoryPatience);
    HostLook look;
    look.version = textIn(client.get("/v1/health", deadline), "version");
    const ctl::QueryAnswer answer = client.query({"KINAGT", {}, false}, deadline, [this] {
        if (isEnding_) throw LookEnds{};
    });
    json inventory = {{"products", productsIn(answer)}, {"warnings", warningsIn(answer)}};
    try {
        inventory["instances"] = ctl::listInstances(client, deadline);
    } catch (const ctl::Failure& failure) {
        // What is installed is worth telling without what runs.
        inventory["warnings"].push_back(std::string("which agents run is not known: ") +
                                        failure.what());
    }
    look.inventory = textOf(inventory);
    return look;
}

}  // namespace fleet
