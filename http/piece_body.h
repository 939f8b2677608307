/// A request's body on its way to a BodyTaker.
#pragma once

#include <array>
#include <boost/beast/http/buffer_body.hpp>
#include <boost/beast/http/parser.hpp>
#include <boost/beast/http/string_body.hpp>
#include <memory>
#include <string_view>
#include <utility>

#include "http/handler.h"

namespace http {

/// Belongs in turn to the I/O thread, which fills a piece, and to a worker thread, which hands it
/// over.
struct PieceBody {
    /// Goes on where the parser of a head has stopped.
    PieceBody(boost::beast::http::request_parser<boost::beast::http::string_body>&& head,
              std::unique_ptr<BodyTaker> bodyTaker)
        : parser(std::move(head)), taker(std::move(bodyTaker)) {
        parser.body_limit(taker->mostBytes());
    }

    /// Lets the parser write the next piece.
    void offer() {
        parser.get().body().data = bytes.data();
        parser.get().body().size = bytes.size();
        parser.get().body().more = true;
    }
    std::string_view piece() { return {bytes.data(), bytes.size() - parser.get().body().size}; }

    boost::beast::http::request_parser<boost::beast::http::buffer_body> parser;
    const std::unique_ptr<BodyTaker> taker;
    std::array<char, 64 * 1024> bytes{};
};

}  // namespace http
