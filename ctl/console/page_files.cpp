#include "ctl/console/page_files.h"

#include <algorithm>
#include <stdexcept>
#include <utility>

#include "ctl/client/transfer/checksum.h"
#include "ctl/console/refusals.h"
#include "ctl/console/request_check.h"

namespace console {
namespace {

constexpr std::string_view kIndex = "/index.html";

/// Each form of a file has a tag of its own.
std::string tagOf(const std::string& bytes) {
    ctl::Checksum sum;
    sum.add(reinterpret_cast<const unsigned char*>(bytes.data()), bytes.size());
    return '"' + sum.finish() + '"';
}

std::string_view trimmed(std::string_view text) {
    text.remove_prefix(std::min(text.find_first_not_of(" \t"), text.size()));
    return text.substr(0, text.find_last_not_of(" \t") + 1);
}

/// Whether `holds` is true of an element of a list with commas.
template <typename Holds>
bool anyOf(std::string_view list, Holds holds) {
    while (true) {
        const std::size_t end = list.find(',');
        if (holds(trimmed(list.substr(0, end)))) return true;
        if (end == std::string_view::npos) return false;
        list.remove_prefix(end + 1);
    }
}

/// "q=0", "q=0.0" and so on: not at all.
bool isZero(std::string_view weight) {
    weight = trimmed(weight);
    return weight.substr(0, 2) == "q=" &&
           weight.substr(2).find_first_not_of("0.") == std::string_view::npos;
}

}  // namespace

PageFiles::PageFiles(std::vector<PageFile> files) {
    for (PageFile& file : files) {
        std::string tag = tagOf(file.bytes);
        std::string gzipTag = tagOf(file.gzip);
        entries_.push_back({std::move(file), std::move(tag), std::move(gzipTag)});
    }
    if (find(kIndex) == nullptr) throw std::runtime_error("the page has no index.html");
}

http::Reply PageFiles::answer(const http::Request& request) const {
    const std::string_view path = pathOf(request);
    if (!onlyReads(request)) return wrongMethodAt(path, "GET, HEAD");
    const bool isPlace = path.find('.') == std::string_view::npos;
    const Entry* const entry = find(isPlace ? kIndex : path);
    if (entry == nullptr) return refusalAt(path, 404, "there is no such file");
    const bool isSmall =
        !entry->file.gzip.empty() && takesGzip(fieldOf(request, "Accept-Encoding"));
    const std::string& tag = isSmall ? entry->gzipTag : entry->tag;
    const bool isKnown = namesTag(fieldOf(request, "If-None-Match"), tag);
    http::Reply reply{isKnown ? 304U : 200U, "", entry->file.type};
    if (!isKnown) reply.body = isSmall ? entry->file.gzip : entry->file.bytes;
    reply.fields = {{"ETag", tag}, {"Cache-Control", "no-cache"}, {"Vary", "Accept-Encoding"}};
    if (isSmall) reply.fields.emplace_back("Content-Encoding", "gzip");
    return reply;
}

const PageFiles::Entry* PageFiles::find(std::string_view path) const {
    const auto found = std::find_if(entries_.begin(), entries_.end(),
                                    [path](const Entry& entry) { return entry.file.path == path; });
    return found == entries_.end() ? nullptr : &*found;
}

const http::Fields& pageFields() {
    static const http::Fields kFields = {
        {"Content-Security-Policy",
         "default-src 'none'; script-src 'self'; style-src 'self'; img-src 'self'; connect-src "
         "'self'; base-uri 'none'; form-action 'none'; frame-ancestors 'none'"},
        {"X-Content-Type-Options", "nosniff"},
        {"Referrer-Policy", "no-referrer"},
        {"Cross-Origin-Opener-Policy", "same-origin"},
        {"Cross-Origin-Resource-Policy", "same-origin"},
        {"Cache-Control", "no-store"}};
    return kFields;
}

bool takesGzip(std::string_view acceptEncoding) {
    return anyOf(acceptEncoding, [](std::string_view coding) {
        const std::size_t end = coding.find(';');
        if (trimmed(coding.substr(0, end)) != "gzip") return false;
        return end == std::string_view::npos || !isZero(coding.substr(end + 1));
    });
}

bool namesTag(std::string_view ifNoneMatch, std::string_view tag) {
    return anyOf(ifNoneMatch, [tag](std::string_view known) {
        if (known.substr(0, 2) == "W/") known.remove_prefix(2);
        return known == "*" || known == tag;
    });
}

}  // namespace console
