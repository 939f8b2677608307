// Writes the manual pages of the host: zavhost_manual TEMPLATES DIRECTORY DATE

#include <string>

#include "host/process/configuration/option_table.h"
#include "tools/manual/mdoc.h"
#include "tools/manual/pages.h"

namespace manual {
namespace {

using host::OptionKind;
using host::OptionRow;

std::string onCommandLine() {
    std::string entries = ".Bl -tag -width Ds\n";
    for (const OptionRow& row : host::optionTable()) {
        const std::string value = row.kind == OptionKind::Flag ? "" : " Ar " + escaped(row.value);
        entries += entry(std::string("Fl -") + row.name + value, row.help);
    }
    entries += entry("Fl -version", "Print the version and end");
    entries += entry("Fl h , Fl -help", "Print the help and end");
    return entries + ".El\n";
}

std::string valueOf(const OptionRow& row) {
    switch (row.kind) {
        case OptionKind::Flag:
            return "Cm true | false";
        case OptionKind::Number:
            return "Ar " + escaped(row.value);
        case OptionKind::Text:
            break;
    }
    return "Qq Ar " + escaped(row.value);
}

std::string inFile() {
    std::string entries = ".Bl -tag -width Ds\n";
    for (const OptionRow& row : host::optionTable()) {
        if (row.place == host::OptionPlace::CommandLineOnly) continue;
        entries += entry(std::string("Cm ") + row.name + " No = " + valueOf(row), row.help);
    }
    return entries + ".El\n";
}

std::string onCommandLineOnly() {
    std::string lines;
    for (const OptionRow& row : host::optionTable()) {
        if (row.place == host::OptionPlace::CommandLineOnly)
            lines += std::string(".Fl -") + row.name + " ,\n";
    }
    return lines;
}

}  // namespace

void writePages(const std::string& templates, const std::string& directory,
                const std::string& date) {
    write(directory + "/zavhost.8",
          filled(templates + "/zavhost.8.in", {{"DATE", date}, {"OPTIONS", onCommandLine()}}));
    write(directory + "/zavhost.conf.5",
          filled(templates + "/zavhost.conf.5.in",
                 {{"DATE", date}, {"KEYS", inFile()}, {"NO_KEYS", onCommandLineOnly()}}));
    write(directory + "/zavmgmt.7", filled(templates + "/zavmgmt.7.in", {{"DATE", date}}));
}

}  // namespace manual
