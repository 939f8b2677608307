#include "host/api/statuses.h"

namespace host {

// clang-format off
const std::vector<StatusMeaning>& statusMeanings() {
    static const std::vector<StatusMeaning> meanings = {
        {400, "the request makes no sense: not HTTP/1.1, framed in an ambiguous way, not JSON, an "
              "unknown parameter, member, column or operator, a value of the wrong type", true},
        {403, "the client's user may not do this", true},
        {404, "there is no such path, or nothing of the name that the request gives", false},
        {405, "the path knows other methods; the field `Allow` lists them", false},
        {409, "a guard refused the request, and nothing was done: `\"guard\"` is its name, "
              "`\"hint\"` the way out; or the request does not go with the task's state", false},
        {412, "the request means another journal", false},
        {413, "the body is larger than 1 MiB", true},
        {429, "too many tasks wait; `Retry-After` says when to ask again", false, true},
        {500, "the table failed, with the status that it gave, or something that the request needs",
         true},
        {501, "the body comes in a transfer coding other than `chunked`", true},
        {503, "too many connections or requests, or the host is about to end, or the journal cannot "
              "be written to; `\"guard\"` is there if an unguarded host would have taken the "
              "request", true, true},
    };
    return meanings;
}
// clang-format on

}  // namespace host
