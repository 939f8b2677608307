/// The files of the page that the browser shows.
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "http/handler.h"

namespace console {

struct PageFile {
    std::string path;   ///< such as "/app.js"
    std::string type;   ///< Content-Type
    std::string bytes;  ///< as they are
    std::string gzip;   ///< the same compressed; empty if that is not at hand
};

/// Files that never change. Any thread.
class PageFiles {
public:
    /// One of the files is "/index.html". Throws std::runtime_error if it is not.
    explicit PageFiles(std::vector<PageFile> files);

    /// The answer to GET or HEAD for a path. A path without a dot is a place within the page, which
    /// index.html shows.
    http::Reply answer(const http::Request& request) const;

private:
    struct Entry {
        PageFile file;
        std::string tag;
        std::string gzipTag;
    };

    const Entry* find(std::string_view path) const;

    std::vector<Entry> entries_;
};

/// The fields of all answers of a server of the page: the browser runs and asks for nothing that
/// comes from elsewhere, shows it in no other page, and keeps nothing.
const http::Fields& pageFields();

/// Whether a field Accept-Encoding takes gzip.
bool takesGzip(std::string_view acceptEncoding);

/// Whether a field If-None-Match names this tag, which has its quotation marks.
bool namesTag(std::string_view ifNoneMatch, std::string_view tag);

}  // namespace console
