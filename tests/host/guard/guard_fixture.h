/// Guards on a home, an inventory and tasks of the test's own.
#pragma once

#include <gtest/gtest.h>

#include <algorithm>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "host/guard/guards.h"
#include "host/guard/refusal.h"
#include "host/journal/journal.h"
#include "host/made_up_table.h"
#include "support/scratch_dir.h"

class GuardTest : public testing::Test {
protected:
    using Conditions = std::vector<oxa::Predicate>;

    explicit GuardTest(const char* codePage = "UTF-8") : page(codePage) {
        files.makeDir("home/config");
        files.makeDir("depot");
        for (MadeUpTable* const table : {&requests, &outcomes})
            table->RegisterWithManager();
        install({"ax", "um", "ux"});
        tables.emplace(oxa::tables());
        feed.emplace(*tables);
        tasks.emplace(*tables, *feed, journal, true);
        guards.emplace(host::Site{page, files.path("home"), files.path("depot")}, *tasks);
    }

    /// A condition COLUMN=value for each pair.
    static Conditions given(const std::vector<std::pair<std::string, std::string>>& values) {
        Conditions conditions;
        for (const auto& [column, value] : values)
            conditions.push_back({column, OPER_EQ, value});
        return conditions;
    }
    static Conditions command(const std::string& name, const std::string& product,
                              const std::vector<std::pair<std::string, std::string>>& more = {}) {
        Conditions conditions = given({{"COMMAND", name}, {"TRANSID", "t"}, {"PRODUCT", product}});
        for (const oxa::Predicate& each : given(more))
            conditions.push_back(each);
        return conditions;
    }

    /// The request as it is handed on. Throws Refusal.
    host::CommandRequest admitted(const Conditions& conditions, bool force = false) {
        host::CommandRequest request(conditions, force);
        guards->admit(request);
        return request;
    }
    /// "GUARD STATUS: REASON; HINT", or "" when the request passes.
    std::string refusalOf(const Conditions& conditions, bool force = false) {
        try {
            admitted(conditions, force);
            return "";
        } catch (const host::Refusal& refusal) {
            return refusal.guard() + " " + std::to_string(refusal.httpStatus()) + ": " +
                   refusal.what() + "; " + refusal.hint();
        }
    }
    /// Only the guard's name.
    std::string refuser(const Conditions& conditions, bool force = false) {
        const std::string refusal = refusalOf(conditions, force);
        return refusal.substr(0, refusal.find(' '));
    }

    /// A task of that product has been accepted.
    void accept(const std::string& name, const std::string& product) {
        Conditions conditions = given({{"COMMAND", name}, {"TRANSID", "other"}});
        conditions.push_back({"PRODUCT", OPER_EQ, product});
        const std::string row =
            RowBuilder().text("other", 8).text(name, 16).integer(0).text(product, 8);
        host::TaskList::Request request(*tasks, {tables->find("KAGREQT"), conditions}, "somebody");
        request.answered({row, static_cast<unsigned>(row.size())}, {});
    }
    /// Its outcome has come.
    void finish() { outcomes.publish(RowBuilder().text("other", 8).integer(0)); }

    /// Makes the home's inventory program list these products.
    void install(const std::vector<std::string>& products) {
        std::string list = "\"ProdCode\",\"Description\",\"Platform\",\"Version\",\"Release\"\n";
        for (const std::string& product : products)
            list += "\"" + product + "\",\"A product\",\"li6263\",\"060100000\",\"100\"\n";
        files.write("list", list);
        files.script("home/bin/cinfo", "echo \"$*\" >>'" + files.path("inventories") + "'\ncat '" +
                                           files.path("list") + "'\n");
    }
    /// How often the inventory has been taken.
    std::size_t inventories() const {
        if (!files.exists("inventories")) return 0;
        const std::string calls = files.read("inventories");
        return static_cast<std::size_t>(std::count(calls.begin(), calls.end(), '\n'));
    }

    /// A translator that writes down how it was called and does what the body says.
    void translator(const std::string& body) {
        files.script("home/agtqvs6/li6263/bin/zav_xa",
                     "echo \"$*\" >>'" + files.path("calls") + "'\n" + body + "\n");
    }

    const ScratchDir files;
    const host::CodePage page;
    MadeUpTable requests{"KAGREQT",
                         {{"transid", 0, 8, OXA_TYPE_CHARACTER},
                          {"command", 8, 16, OXA_TYPE_CHARACTER},
                          {"retval", 24, 4, OXA_TYPE_INTEGER},
                          {"product", 28, 8, OXA_TYPE_CHARACTER}}};
    MadeUpTable outcomes{
        "KAGDYST", {{"transid", 0, 8, OXA_TYPE_CHARACTER}, {"retval", 8, 4, OXA_TYPE_INTEGER}}};
    std::optional<host::TableSet> tables;
    std::optional<host::OutcomeFeed> feed;
    host::Journal journal{host::Journal::Settings{}};
    std::optional<host::TaskList> tasks;
    std::optional<host::Guards> guards;
};
