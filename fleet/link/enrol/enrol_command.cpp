#include "fleet/link/enrol/enrol_command.h"

#include <CLI/CLI.hpp>
#include <algorithm>
#include <chrono>
#include <exception>
#include <istream>
#include <ostream>

#include "fleet/link/enrol/enrol_error.h"
#include "fleet/link/enrol/enrol_host.h"
#include "fleet/log/log.h"

namespace fleet {
namespace {

constexpr int kWrongWords = 2;
/// No invitation is that long.
constexpr std::size_t kLongestLine = std::size_t{16} * 1024;
constexpr const char* kFooter =
    "Makes this host's keys, tells the centre of them, and writes what zavlink needs to run.\n"
    "The invitation is the line that \"zavfleetd enrol NAME\" prints. It is secret as long as it\n"
    "counts; given as \"-\" it stands in no list of processes:\n"
    "\n"
    "  zavfleetd enrol web-1 | ssh web-1 sudo zavlink enrol --label env=test -\n"
    "\n"
    "What was broken off can be done again with the same invitation. As root, the files in DIR\n"
    "belong to the owner of DIR. To enrol a host anew, stop zavlink and move DIR/link.json and\n"
    "the configuration away.";

std::string firstLineOf(std::istream& in) {
    std::string line(kLongestLine, '\0');
    in.getline(line.data(), static_cast<std::streamsize>(line.size()));
    line.resize(std::char_traits<char>::length(line.c_str()));
    if (line.empty()) throw EnrolError("standard input holds no invitation");
    return line;
}

Labels labelsIn(const std::vector<std::string>& texts) {
    Labels labels;
    for (const std::string& text : texts) {
        const std::size_t equals = text.find('=');
        if (equals == std::string::npos || equals == 0 || equals + 1 == text.size()) {
            throw EnrolError("\"" + text + "\" is no label; it is NAME=VALUE");
        }
        if (!labels.emplace(text.substr(0, equals), text.substr(equals + 1)).second) {
            throw EnrolError("the label \"" + text.substr(0, equals) + "\" is given twice");
        }
    }
    return labels;
}

struct EnrolWords {
    EnrolOptions options;
    std::vector<std::string> labels;
};

void declareEnrolment(CLI::App& app, EnrolWords& words) {
    EnrolOptions& options = words.options;
    app.add_option("INVITATION", options.invitation,
                   "What the centre has printed for this host; - reads it from standard input")
        ->required();
    app.add_option("--directory", options.directory, "Where zavlink keeps the host's keys")
        ->capture_default_str();
    app.add_option("--config", options.configuration, "The configuration to write")
        ->capture_default_str();
    app.add_option("--host-socket", options.hostSocket,
                   "Where zavlink asks the host; without it where zavctl does on this machine");
    app.add_option("--label", words.labels, "NAME=VALUE, by which operators select hosts")
        ->allow_extra_args(false);
    app.footer(kFooter);
}

int enrolAndTell(EnrolWords& words, std::istream& in, std::ostream& out) {
    EnrolOptions& options = words.options;
    options.labels = labelsIn(words.labels);
    if (options.invitation == "-") options.invitation = firstLineOf(in);
    const EnrolledAs enrolled = enrolHost(options, wallClock());
    out << "This host is \"" << enrolled.name << "\" of the fleet \"" << enrolled.fleet
        << "\" now (" << enrolled.host << ").\nIts keys are in " << options.directory
        << ", its configuration is " << options.configuration
        << ".\nNext: systemctl enable --now zavlink\n";
    return 0;
}

}  // namespace

int runEnrolCommand(std::vector<std::string> words, std::istream& in, std::ostream& out,
                    std::ostream& err) {
    CLI::App app("Joins a fleet", "zavlink enrol");
    EnrolWords read;
    declareEnrolment(app, read);
    std::reverse(words.begin(), words.end());  // as CLI11 wants them
    try {
        app.parse(words);
    } catch (const CLI::ParseError& error) {
        return app.exit(error, out, err) == 0 ? 0 : kWrongWords;
    }
    try {
        return enrolAndTell(read, in, out);
    } catch (const std::exception& error) {
        // The centre's words may be in it.
        err << lineOf(Priority::Error, error.what(), false);
        return 1;
    }
}

void describeEnrolment(CLI::App& app) {
    static EnrolWords nowhere;
    declareEnrolment(app, nowhere);
}

}  // namespace fleet
