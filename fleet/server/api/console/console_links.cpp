// POST /v1/console-links: an operator's zavctl asks for a link that opens the console in a browser.

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"
#include "fleet/server/api/console/centre_console.h"
#include "fleet/server/api/documents/host_sight.h"
#include "fleet/server/api/schema.h"
#include "fleet/server/api/visit.h"

namespace fleet {

ApiEndpoint postConsoleLink;
Schema consoleLinkSchema;

http::Answer postConsoleLink(Visit& visit, const Call&) {
    if (!visit.services.servesConsole) {
        throw NothingThere(
            "this centre serves no console; \"zavfleetd serve --console\" does, and \"zavctl "
            "--fleet URL console\" serves one on your own machine");
    }
    const ConsoleLink link = visit.services.browsers.makeLink(visit.key, wallClock());
    return http::jsonReply(201, textOf({{"path", CentreConsole::openingFor(link.token)},
                                        {"expires", timeOfDocument(link.expires)}}));
}

nlohmann::ordered_json consoleLinkSchema(Components& components) {
    return shape::object(
        "ConsoleLink", "What opens the centre's console in a browser, once.",
        {{"path", shape::text("what to put behind the centre's URL; whoever opens it first sees "
                              "what the operator sees")},
         {"expires", shape::about("when it is of no use any more", components.ref(timeSchema))}});
}

}  // namespace fleet
