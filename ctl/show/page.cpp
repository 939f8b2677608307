#include "ctl/show/page.h"

#include <cstdio>
#include <nlohmann/json.hpp>

using nlohmann::json;

namespace ctl {
namespace {

void write(const std::string& text, std::FILE* file) {
    std::fwrite(text.data(), 1, text.size(), file);
    std::fflush(file);
}

}  // namespace

std::string complaint(const std::string& text) {
    return "zavctl: " + text + "\n";
}

std::string jsonText(const json& document) {
    return document.dump(2, ' ', false, json::error_handler_t::replace) + "\n";
}

Page jsonPage(const json& document, ExitStatus status) {
    return {jsonText(document), {}, status};
}

ExitStatus print(const Page& page) {
    write(page.out, stdout);
    write(page.err, stderr);
    return page.status;
}

}  // namespace ctl
