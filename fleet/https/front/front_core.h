/// What the connections of a front share. Everything here belongs to the front's thread, except
/// where a member says otherwise.
#pragma once

#include <array>
#include <boost/asio/basic_waitable_timer.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/posix/stream_descriptor.hpp>
#include <chrono>
#include <functional>
#include <memory>
#include <string>
#include <unordered_map>
#include <utility>

#include "fleet/https/front/front_counts.h"
#include "fleet/https/front/front_limits.h"
#include "system/file_descriptor.h"

namespace fleet {

class FrontConnection;

using FrontDescriptor =
    boost::asio::posix::basic_stream_descriptor<boost::asio::io_context::executor_type>;
using FrontTimer =
    boost::asio::basic_waitable_timer<std::chrono::steady_clock,
                                      boost::asio::wait_traits<std::chrono::steady_clock>,
                                      boost::asio::io_context::executor_type>;

struct FrontCore {
    FrontCore(const FrontLimits& frontLimits, std::function<void(sys::FileDescriptor)> taker)
        : limits(frontLimits), take(std::move(taker)) {}

    /// The connection is over: it leaves the books, and its place is free.
    void forget(FrontConnection* connection, const std::string& origin) {
        const auto count = origins.find(origin);
        if (count != origins.end() && --count->second == 0) origins.erase(count);
        connections.erase(connection);
        counts.connections.set(connections.size());
        onPlaceFree();
    }

    boost::asio::io_context io{1};  // any thread may post
    const FrontLimits limits;
    const std::function<void(sys::FileDescriptor)> take;
    FrontCounts counts;  // any thread

    std::function<void()> onPlaceFree;
    std::unordered_map<std::string, std::size_t> origins;  ///< connections from each
    std::unordered_map<FrontConnection*, std::shared_ptr<FrontConnection>> connections;
    /// Where a piece stands between one read and the next write.
    std::array<char, 16 * 1024> piece{};
};

}  // namespace fleet
