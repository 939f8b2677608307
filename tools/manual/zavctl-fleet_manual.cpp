// Writes the manual pages of zavctl for fleets: zavctl-fleet_manual TEMPLATES DIRECTORY DATE
//
// Verbs that only a fleet has get pages of their own. Those that one host has under the same name,
// too, stand on the page about fleets, because the name of a page says nothing of --fleet.

#include <string>
#include <vector>

#include "ctl/verbs/verb_table.h"
#include "fleet/operator/verbs/fleet_arguments.h"
#include "fleet/operator/verbs/fleet_verbs.h"
#include "tools/manual/mdoc.h"
#include "tools/manual/pages.h"
#include "tools/manual/verb_pages.h"

namespace manual {

void writePages(const std::string& templates, const std::string& directory,
                const std::string& date) {
    std::vector<const ctl::Verb*> own;
    std::vector<const ctl::Verb*> changing;
    std::string namesakes;
    for (const ctl::Verb* const verb : fleet::fleetVocabulary().verbs) {
        const ctl::Verb* const hosts = ctl::findVerb(verb->name);
        if (hosts == nullptr)
            own.push_back(verb);
        else if (hosts == verb)
            changing.push_back(verb);
        else
            namesakes += subsectionOf(*verb);
    }
    write(directory + "/zavctl-fleet.1", filled(templates + "/zavctl-fleet.1.in",
                                                {{"DATE", date},
                                                 {"OPTIONS", listOf(fleet::kFleetArguments, false)},
                                                 {"OWN_VERBS", entriesOf(own)},
                                                 {"CHANGING_VERBS", entriesOf(changing)},
                                                 {"NAMESAKES", namesakes},
                                                 {"EXIT_STATUSES", exitStatuses()}}));
    VerbPages{templates, directory, date, "zavctl-fleet", fleet::kFleetArguments, own}.write();
}

}  // namespace manual
