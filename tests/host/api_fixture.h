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
    http::Answer answerTo(const std::string& method, const std::string& target,
                          const std::string& body = "", http::Access access = http::Access::Act) {
        auto handled = api->handle({method, target, body, {0, 0, 0, access}});
        if (auto* const job = std::get_if<http::Job>(&handled)) return (*job)();
        return std::get<http::Answer>(std::move(handled));
    }
    /// An answer that is complete.
    http::Reply ask(const std::string& method, const std::string& target,
                    const std::string& body = "", http::Access access = http::Access::Act) {
        http::Answer answer = answerTo(method, target, body, access);
        if (auto* const reply = std::get_if<http::Reply>(&answer)) return std::move(*reply);
        return {0, "not a reply"};
    }
    void expectError(unsigned status, const std::string& text, const http::Reply& reply) {
        EXPECT_EQ(reply.body, http::errorReply(status, text).body);
        EXPECT_EQ(reply.status, status) << text;
    }

    MadeUpTable table{"PLAIN", plainColumns()};
    std::optional<host::Services> services;
    std::optional<host::Api> api;
};
