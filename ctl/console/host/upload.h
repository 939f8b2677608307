/// Files that a browser puts into the host's depot.
#pragma once

#include <memory>
#include <set>
#include <string>
#include <variant>

#include "ctl/client/address/host_address.h"
#include "embedded/mutex.h"
#include "http/handler.h"

namespace console {

/// The uploads that are under way: a few at a time, and each name once. Any thread.
class Uploads {
public:
    /// Files stand in this directory, without a name, until the host has them.
    explicit Uploads(std::string directory) : directory_(std::move(directory)) {}

    /// Takes the body of the request, which names the file's place in the depot as `path`, and
    /// pushes it as zavctl does, checks included. A reply refuses it.
    http::BodyPlan begin(const http::Request& head, const ctl::HostAddress& host);

    bool empty() const;

private:
    friend class UploadPlace;

    /// Why there is no place for a file of this name; empty if it has one now.
    std::string enter(const std::string& name);
    void leave(const std::string& name);

    const std::string directory_;
    mutable embedded::Mutex lock_;
    std::set<std::string> names_ ZAV_GUARDED_BY(lock_);
};

}  // namespace console
