// ctest-label: threaded
#include "fleet/server/service/centre_service.h"

#include <gtest/gtest.h>

#include <atomic>
#include <future>
#include <memory>
#include <string>

#include "fleet/bus/messages/enrolment.h"
#include "fleet/bus/messages/order.h"
#include "fleet/server/keys/trust/host_enrolment.h"
#include "fleet/server/keys/trust/revocations.h"
#include "fleet/server/store/centre_database.h"
#include "tests/fleet/server/keys/running_fleet.h"

namespace {

using fleet::CentreProgram;
using fleet::CentreService;
using fleet::KeyKind;
using fleet::KeyPair;
using made_fleet::kPatience;
using made_fleet::RunningFleet;
using made_fleet::today;

/// Takes nobody up: the centre is told at its start.
class NoRegister : public fleet::HostRegister {
public:
    void enrol(const fleet::EnrolledHost&) override {}
};

class RunningCentre : public testing::Test {
protected:
    ~RunningCentre() override {
        if (running.valid()) stop();
    }
    const fleet::FleetDirectory& directory() const { return fleet_->made().directory(); }

    /// A host that has joined.
    fleet::EnrolmentAnswer join(const std::string& name) const {
        return join(name, bus, signing, false);
    }
    fleet::EnrolmentAnswer join(const std::string& name, const KeyPair& key, const KeyPair& signs,
                                bool replaces) const {
        fleet::TrustDatabase trust(directory().trustDatabase());
        fleet::HostEnrolment enrolment(trust.connection());
        fleet::EnrolmentRequest request;
        request.fleet = "demo";
        request.token = enrolment.invite({name, {}, replaces}, today());
        request.host = key.publicKey();
        request.signing = signs.publicKey();
        request.machine = "machine";
        NoRegister nobody;
        return enrolment.redeem(fleet::signEnrolment(request, key, signs), directory(), nobody,
                                today());
    }
    void start() {
        service = std::make_unique<CentreService>(fleet::ServiceOptions{directory().path()});
        running = std::async(std::launch::async, [this] { return service->run(); });
        ASSERT_TRUE(
            eventually([this] { return service->centre().isWorking(); }, made_fleet::kWorksWithin));
    }
    CentreProgram::End stop() {
        service->end();
        return running.get();
    }
    std::optional<fleet::HostRecord> recordOf(const std::string& host) const {
        return service->centre()
            .ask([host](fleet::CentreParts& parts) { return parts.store.host(host); })
            .get();
    }

    static fleet::Order orderFor(const std::string& host) {
        fleet::Order order;
        order.fleet = "demo";
        order.id = fleet::makeOrderId();
        order.host = host;
        order.selector = "*";
        order.kind = "START";
        order.body = "{}";
        order.issued = today();
        order.expires = today() + made_fleet::kDay;
        return order;
    }
    std::optional<fleet::Number> submit(const fleet::Order& order) const {
        const KeyPair key = KeyPair::make(KeyKind::User);
        return service->centre().submit(signOrder(order, key, "certificate")).get();
    }
    std::optional<fleet::OrderRecord> orderNow(const fleet::Order& order) const {
        return service->centre()
            .ask([&](fleet::CentreParts& parts) { return parts.store.order(order.host, order.id); })
            .get();
    }

    const std::unique_ptr<RunningFleet> fleet_ = RunningFleet::start();
    const KeyPair bus = KeyPair::make(KeyKind::User);
    const KeyPair signing = KeyPair::make(KeyKind::User);
    std::unique_ptr<CentreService> service;
    std::future<CentreProgram::End> running;
};

TEST_F(RunningCentre, KnowsTheHostsThatJoinedBeforeItsStart) {
    join("web-1");
    start();
    ASSERT_TRUE(eventually([this] { return recordOf(bus.publicKey()).has_value(); }));
    const fleet::HostRecord record = *recordOf(bus.publicKey());
    EXPECT_EQ(record.name, "web-1");
    EXPECT_EQ(record.signing, signing.publicKey());
    EXPECT_EQ(record.machine, "machine");
    EXPECT_EQ(stop(), CentreProgram::End::Asked);
}

TEST_F(RunningCentre, HasTheBusCutOffAHostThatIsRevokedWhileItRuns) {
    const fleet::EnrolmentAnswer answer = join("web-1");
    start();
    std::atomic<bool> isCut{false};
    fleet::ConnectionEvents events;
    events.closed = [&isCut](const std::string&) { isCut = true; };
    const auto host = fleet_->connect(bus, answer.userToken, events);
    ASSERT_TRUE(host.connection) << host.text;
    fleet::TrustDatabase trust(directory().trustDatabase());
    fleet::RevokedKeys(trust.connection()).revokeHost("web-1", today());
    EXPECT_TRUE(eventually([&isCut] { return isCut.load(); }));
}

TEST_F(RunningCentre, TakesUpWhatACopyThatWasPutBackDoesNotKnow) {
    join("web-1");
    start();
    const std::string host = bus.publicKey();
    ASSERT_TRUE(eventually([&] { return recordOf(host).has_value(); }));
    const ScratchDir copies;
    fleet::backUpCentre(directory().orders(), copies.path("orders.db"));
    fleet::Order order = orderFor(host);
    ASSERT_EQ(submit(order), fleet::Number{1});
    ASSERT_TRUE(eventually([&] { return orderNow(order)->isPublished; }));
    stop();
    service.reset();  // it has the directory's lock

    fleet::putBackCentre(directory().orders(), copies.path("orders.db"));
    start();
    const auto known = orderNow(order);
    ASSERT_TRUE(known.has_value()) << "it is on the bus";
    EXPECT_EQ(known->number, fleet::Number{1});
    EXPECT_GT(submit(orderFor(host)).value(), fleet::Centre::kRestoreGap);
    EXPECT_GT(service->centre()
                  .ask([](fleet::CentreParts& parts) { return parts.store.listUntil(); })
                  .get(),
              today());
}

TEST_F(RunningCentre, KnowsWhatHostsGotThatJoinedAfterTheCopyThatWasPutBack) {
    start();
    const ScratchDir copies;
    fleet::backUpCentre(directory().orders(), copies.path("orders.db"));
    stop();
    service.reset();
    join("web-1");
    start();
    const std::string host = bus.publicKey();
    ASSERT_TRUE(eventually([&] { return recordOf(host).has_value(); }));
    const fleet::Order order = orderFor(host);
    ASSERT_EQ(submit(order), fleet::Number{1});
    ASSERT_TRUE(eventually([&] { return orderNow(order)->isPublished; }));
    stop();
    service.reset();

    fleet::putBackCentre(directory().orders(), copies.path("orders.db"));
    start();
    ASSERT_TRUE(orderNow(order).has_value()) << "it is on the bus";
    EXPECT_GT(submit(orderFor(host)).value(), fleet::Centre::kRestoreGap);
}

TEST_F(RunningCentre, EndsTheOrdersOfAHostThatIsReplacedOrRevoked) {
    join("web-1");
    start();
    const std::string host = bus.publicKey();
    ASSERT_TRUE(eventually([&] { return recordOf(host).has_value(); }));
    const fleet::Order order = orderFor(host);
    submit(order);
    join("web-1", KeyPair::make(KeyKind::User), KeyPair::make(KeyKind::User), true);
    const auto hasEnded = [&] { return orderNow(order)->outcome.has_value(); };
    ASSERT_TRUE(eventually(hasEnded)) << "nobody else will tell";
    EXPECT_EQ(orderNow(order)->outcome->state, "unknown");
}

TEST_F(RunningCentre, IsAProgramThatEndsWhenItIsTold) {
    Program program({ZAV_BUILD_DIR "/bin/zavfleetd", "--directory", directory().path(), "serve",
                     "--port", "0"});
    ASSERT_TRUE(program.awaitOutput("started", kPatience)) << program.err();
    EXPECT_TRUE(eventually(
        [&program] { return program.err().find("the centre works") != std::string::npos; },
        made_fleet::kWorksWithin));
    program.signal(SIGTERM);
    const ProgramResult result = program.wait();
    EXPECT_EQ(result.status, 0) << result.err;
    EXPECT_EQ(result.err.find("error"), std::string::npos) << result.err;
}

}  // namespace
