/// One soak from its beginning to its verdict.
#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <string>

#include "soak/gauges.h"
#include "soak/host_process.h"
#include "soak/load/client.h"
#include "soak/load/subscriber.h"
#include "soak/mix.h"
#include "soak/weather.h"

namespace soak {

struct Options {
    double minutes = 10;
    std::uint64_t seed = 1;
    std::size_t clients = 200;
    std::string host;    ///< the program
    std::string plugin;  ///< empty: the host's own
};

class Run {
public:
    /// Starts the host.
    Run(const Options& options, const SoakHome& home);

    enum class Result { Good, Bad, Interrupted };
    Result toTheEnd();

    /// For signal handlers: makes toTheEnd() return soon.
    static void interrupt();
    static bool interrupted();

private:
    bool openControl(const std::string& after);
    void traffic(double seconds);
    void kills(double seconds);
    std::string killHost();
    void drain();
    bool awaitFence(Way way);
    bool turnUntil(double seconds, const std::function<bool()>& done);
    Gauges settledGauges();
    void judgeHost(const Gauges& before, const Gauges& after);
    void judgeTraffic();
    void judgeJournal();
    bool addListed(std::string& position, std::multimap<std::string, std::string>& states);
    void endHost();
    void progress();
    void printTraffic() const;
    void printHost(const Gauges& before, const Gauges& after) const;
    void printFaults() const;
    bool goesOn();

    const Options options_;
    const SoakHome& home_;
    World world_;
    HostProcess host_;
    Crowd crowd_;
    Mix mix_;
    Weather weather_;
    double nextProgress_ = 0;
    ControlSubscriber* control_ = nullptr;  ///< one of the crowd
};

}  // namespace soak
