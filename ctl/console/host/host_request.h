/// Requests that the console hands to the host.
#pragma once

#include "ctl/client/address/host_address.h"
#include "ctl/console/answer_room.h"
#include "ctl/console/host/host_streams.h"
#include "http/handler.h"

namespace console {

/// Hands a request to the host as it is, and its answer back: a reply, or a stream if the host
/// begins one. A host that is away or makes no sense becomes a reply with status 502, one that lets
/// the address's time-out pass one with 504, and one for which there is no room one with 503.
/// Blocks. Any thread.
http::Answer passOn(const http::Request& request, const ctl::HostAddress& host,
                    HostStreams& streams, const AnswerRoom& room);

}  // namespace console
