/// From an HTTP request to what it asks for, or to the reason why it is refused. Runs nothing.
#pragma once

#include <string>
#include <string_view>
#include <variant>
#include <vector>

#include "embedded/oxa_host.h"
#include "host/http/url.h"
#include "host/tables/code_page.h"

namespace host {

struct TablesRequest {};
struct HealthRequest {};

struct QueryRequest {
    const oxa::Table* table = nullptr;  ///< the router's
    std::vector<oxa::Predicate> where;
};

struct EventsRequest {
    const oxa::Table* table = nullptr;  ///< the router's
    std::vector<oxa::Predicate> where;
};

struct Refusal {
    unsigned status = 400;  ///< an HTTP status
    std::string text;       ///< a sentence for the client, UTF-8 as far as the request was
    std::string allow;      ///< with 405: the method that the path knows
};

using Request = std::variant<TablesRequest, HealthRequest, QueryRequest, EventsRequest, Refusal>;

/// Immutable; may be used by several threads at once.
class Router {
public:
    /// The tables that are offered, and the code page that they speak.
    Router(std::vector<oxa::Table> tables, CodePage codePage)
        : tables_(std::move(tables)), codePage_(std::move(codePage)) {}

    /// `target` and `body` as they came.
    Request route(std::string_view method, std::string_view target, std::string_view body) const;

    const std::vector<oxa::Table>& tables() const { return tables_; }
    const CodePage& codePage() const { return codePage_; }
    /// The table of that exact name, or null.
    const oxa::Table* find(std::string_view name) const;

private:
    Request query(std::string_view body) const;
    Request events(const Target& target) const;

    const std::vector<oxa::Table> tables_;
    const CodePage codePage_;
};

}  // namespace host
