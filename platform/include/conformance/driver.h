/// The conformance kit as an implementation of the seam sees it.
///
/// The kit calls the seam's own operations directly. What the seam offers to a plug-in only from
/// one side, such as tables, it reaches through a driver: a few functions with which an agent
/// process asks its platform for rows, calls an RPC interface and looks at its trace. Whoever tests
/// a platform writes one driver, links it with the platform and zavmgmt::conformance, which brings
/// main(), and runs the program.
#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "platform/ncs.h"
#include "platform/oxa.h"

namespace conformance {

/// One condition of a request; all of a request's conditions must hold.
struct Condition {
    std::string column;
    _IntfOper op;
    std::string value;  ///< may hold zero bytes
};
using Conditions = std::vector<Condition>;

/// Rows as their tables made them, one text of the row's size each.
using Rows = std::vector<std::string>;

/// What a plain query came to: the platform's status and the rows that were there by then.
struct Answer {
    int status = OXA_OK;
    Rows rows;
};

/// Takes the rows of a subscription; the result is what rtoxa::Dispatch() is to return.
using Sink = std::function<int(const Rows& rows)>;

/// A live subscription; ends with this object. Its sink must not be called afterwards.
class Subscription {
public:
    virtual ~Subscription() = default;
};

/// The outcome of one remote call: a fault code, or 0 and the marshalled results.
struct CallResult {
    std::uint32_t fault = 0;
    std::string results;
};

/// Traces are collected while this object exists.
class TraceCapture {
public:
    virtual ~TraceCapture() = default;
    /// The lines so far in the order in which they were written, each with whatever the platform
    /// puts around the text.
    virtual std::vector<std::string> lines() = 0;
};

/// What traces to select while they are captured.
enum class Selection { Everything, ErrorsOnly };

/// The agent process's side of a platform. What a driver leaves as it is here counts as not
/// offered, and operations that can only be checked with it count as not fulfilled. Each rule of
/// the kit runs in a process of its own, which makes a driver when it needs one; that driver lives
/// to the end of the process.
class Driver {
public:
    Driver() = default;
    Driver(const Driver&) = delete;
    Driver& operator=(const Driver&) = delete;
    virtual ~Driver() = default;

    /// Runs a plain query on the table that is registered under this name.
    virtual Answer query(const std::string& table, const Conditions& where);
    /// Opens a subscription, which is live when the function returns. Null when there is no such
    /// table.
    virtual std::unique_ptr<Subscription> subscribe(const std::string& table,
                                                    const Conditions& where, Sink sink);
    /// Calls an operation of a registered interface as a remote client would.
    virtual CallResult call(const uuid__t& interface, std::uint32_t version,
                            std::uint16_t operation, const std::string& parameters);
    /// Begins to capture what RAS1_... writes, with this selection in force.
    virtual std::unique_ptr<TraceCapture> captureTrace(Selection selection);
};

/// Defined by the program that links the kit. Never null; may throw to say that the platform cannot
/// be started.
std::unique_ptr<Driver> makeDriver();

}  // namespace conformance
