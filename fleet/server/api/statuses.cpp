#include "fleet/server/api/statuses.h"

namespace fleet {

// clang-format off
const std::vector<routes::StatusMeaning>& centreStatusMeanings() {
    static const std::vector<routes::StatusMeaning> meanings = {
        {400, "the request makes no sense: not HTTP/1.1, framed in an ambiguous way, not JSON, an "
              "unknown parameter or member, a value of the wrong type, a bad selector, something "
              "that is not signed as it must be", true},
        {401, "there is no session, it is over, or its key counts no longer", false},
        {403, "the operator's role, or who they are, does not allow it", false},
        {404, "there is no such path, or nothing of the name that the request gives, or it is not "
              "for the operator to see", false},
        {405, "the path knows other methods; the field `Allow` lists them", false},
        {409, "the request does not go with the state that the roll-out is in", false},
        {413, "the body is larger than 1 MiB", true},
        {416, "the file ends before that", false},
        {429, "too much is under way, for this operator or for all; `Retry-After` says when to ask "
              "again", false, true},
        {500, "the centre could not do this; its log says why", true},
        {501, "the body comes in a transfer coding other than `chunked`", true},
        {503, "too many connections or requests, or the centre waits for the bus, is too busy or "
              "about to end", true, true},
        {507, "there is no room for the file", false},
    };
    return meanings;
}
// clang-format on

}  // namespace fleet
