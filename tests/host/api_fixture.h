/// The host's interface without a server, on a table of the test's.
#pragma once

#include <gtest/gtest.h>

#include <optional>
#include <string>
#include <utility>

#include "host/api/api.h"
#include "host/api/routes.h"
#include "host/api/services.h"
#include "host/made_up_table.h"

class ApiTest : public testing::Test {
protected:
    explicit ApiTest(const char* codePage = "UTF-8") {
        table.RegisterWithManager();
        services.emplace(oxa::tables(), host::CodePage(codePage), "/home/of/it");
        api.emplace(*services, host::routes());
    }

    /// The answer, whoever makes it.
    host::Answer answerTo(const std::string& method, const std::string& target,
                          const std::string& body = "", host::Access access = host::Access::Act) {
        auto handled = api->handle({method, target, body, {0, 0, 0, access}});
        if (auto* const job = std::get_if<host::Job>(&handled)) return (*job)();
        return std::get<host::Answer>(std::move(handled));
    }
    /// An answer that is complete.
    host::Reply ask(const std::string& method, const std::string& target,
                    const std::string& body = "", host::Access access = host::Access::Act) {
        host::Answer answer = answerTo(method, target, body, access);
        if (auto* const reply = std::get_if<host::Reply>(&answer)) return std::move(*reply);
        return {0, "not a reply"};
    }
    void expectError(unsigned status, const std::string& text, const host::Reply& reply) {
        EXPECT_EQ(reply.body, host::errorReply(status, text).body);
        EXPECT_EQ(reply.status, status) << text;
    }

    MadeUpTable table{"PLAIN", plainColumns()};
    std::optional<host::Services> services;
    std::optional<host::Api> api;
};
