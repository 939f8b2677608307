/// Fetches the files of orders from the centre.
#pragma once

#include <functional>
#include <memory>
#include <stdexcept>
#include <string>

#include "fleet/bus/accounts/nkey.h"
#include "fleet/bus/messages/order.h"
#include "fleet/https/client/https_client.h"
#include "fleet/link/files/spool.h"

namespace fleet {

/// Where the files are, and who asks for them.
struct FileSourceSettings {
    std::string fleet;
    std::string url;        ///< the centre's; "" if this link was never told
    std::string authority;  ///< the certificate that vouches for the centre, PEM
    KeyPair signing;        ///< the link's
};

/// A file cannot be had now, but perhaps later; what() says why.
class NotFetched : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// One thread at a time.
class FileSource {
public:
    /// `isWanted` is asked before each piece, whether what is fetched is still wanted.
    FileSource(FileSourceSettings settings, std::function<bool()> isWanted);

    /// Has the file in the spool when it returns. Goes on with what is there of it. Throws
    /// NotFetched, and FileError if it cannot be written.
    void fetch(const OrderFile& file, Spool& spool);

private:
    HttpsAnswer piece(const std::string& sum, std::uint64_t from);
    HttpsAnswer ask(const std::string& sum, std::uint64_t from);
    void openSession();

    const FileSourceSettings settings_;
    const std::function<bool()> isWanted_;
    std::unique_ptr<HttpsClient> client_;
    std::string session_;
};

}  // namespace fleet
