#include "ctl/show/page.h"

#include <cstdio>
#include <nlohmann/json.hpp>

#include "ctl/show/fold.h"
#include "ctl/show/printable.h"
#include "ctl/show/terminal.h"

using nlohmann::json;

namespace ctl {
namespace {

void write(const std::string& text, std::FILE* file) {
    std::fwrite(text.data(), 1, text.size(), file);
    std::fflush(file);
}

std::string fitted(const std::string& text, const Output& output) {
    return output.columns > 0 ? foldedText(text, output.columns) : text;
}

std::string dumped(const json& document, int indent) {
    return withoutTerminalControls(
        document.dump(indent, ' ', false, json::error_handler_t::replace));
}

}  // namespace

std::string complaint(const std::string& text) {
    const bool isMild = text.rfind("note: ", 0) == 0 || text.rfind("warning: ", 0) == 0;
    return toned("zavctl:", isMild ? Tone::Attention : Tone::Bad, standardError()) + " " +
           redacted(text) + "\n";
}

Page failurePage(const Failure& failure, Format format) {
    Page page{{}, complaint(failure.what()), failure.status()};
    if (!failure.hint().empty()) page.err += "  " + printable(failure.hint()) + "\n";
    if (format == Format::Text) return page;
    json document = {{"error", failure.what()}};
    if (!failure.guard().empty()) document["guard"] = failure.guard();
    if (!failure.hint().empty()) document["hint"] = failure.hint();
    page.out = jsonText(document);
    return page;
}

std::string jsonText(const json& document) {
    return dumped(document, 2) + "\n";
}

std::string jsonLine(const json& document) {
    return dumped(document, -1);
}

Page jsonPage(const json& document, ExitStatus status) {
    return {jsonText(document), {}, status};
}

ExitStatus print(const Page& page) {
    write(page.isVerbatim ? page.out : fitted(page.out, standardOutput()), stdout);
    write(fitted(page.err, standardError()), stderr);
    return page.status;
}

}  // namespace ctl
