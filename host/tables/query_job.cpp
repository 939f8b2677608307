#include "host/tables/query_job.h"

#include <cstdio>
#include <exception>

namespace host {
namespace {

Reply statusReply(const std::string& table, int status) {
    if (status == OXA_GONE) return errorReply(404, "table " + table + " is no longer offered");
    char number[16];
    std::snprintf(number, sizeof number, "0x%08X", static_cast<unsigned>(status));
    return errorReply(500, "table " + table + " failed with status " + number);
}

Reply sampled(const QueryRequest& request, const CodePage& codePage, TaskWatch& watch) {
    oxa::Rows rows;
    {
        TaskWatch::Request running(watch, *request.table);
        const int status = oxa::query(request.table->name, request.where, rows);
        if (status != OXA_OK) return statusReply(request.table->name, status);
        running.answered(rows);
    }
    return {200, rowsDocument(*request.table, rows, codePage), ""};
}

}  // namespace

Reply answerQuery(const QueryRequest& request, const CodePage& codePage, TaskWatch& watch) {
    try {
        return sampled(request, codePage, watch);
    } catch (const std::exception&) {
        // Names nothing: composing a text may be what failed.
        return {500, "{\"error\":\"the request failed for want of memory\"}", ""};
    }
}

}  // namespace host
