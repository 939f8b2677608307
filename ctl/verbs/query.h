/// query: the rows of a table.
#pragma once

#include "ctl/client/host_client.h"
#include "ctl/show/page.h"

namespace ctl {

struct Invocation;

QueryAnswer askQuery(const Invocation& invocation);
/// For people, a configuration and what stands for passwords is "***". As for any command, the
/// status of one that the request table carried out is that of its reply.
Page showQuery(const TableQuery& query, const QueryAnswer& answer, Format format);

/// The command line that does what such a query of the request table would do, to the same instance,
/// such as "zavctl stop ux"; empty if there is none.
std::string verbInPlaceOf(const TableQuery& query);

}  // namespace ctl
