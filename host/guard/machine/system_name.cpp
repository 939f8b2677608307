#include "host/guard/machine/system_name.h"

#include <sys/utsname.h>

#include <algorithm>
#include <cctype>
#include <utility>

#include "host/tables/plugin_facts.h"

namespace host {

std::string shortHostName() {
    utsname names{};
    if (::uname(&names) != 0) return "";
    const std::string name = names.nodename;
    return name.substr(0, name.find('.'));
}

std::string systemCodeOf(std::string product) {
    if (product == plugin::kUniversalAgent) return "UA";
    std::transform(product.begin(), product.end(), product.begin(),
                   [](unsigned char c) { return static_cast<char>(std::toupper(c)); });
    return product;
}

std::string systemName(const std::string& product, const std::string& instance) {
    std::string name = shortHostName() + ":" + systemCodeOf(product);
    return instance.empty() ? name : instance + ":" + std::move(name);
}

}  // namespace host
