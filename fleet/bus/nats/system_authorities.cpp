#include "fleet/bus/nats/system_authorities.h"

namespace fleet {
namespace {

thread_local std::uint64_t withheld = 0;

}  // namespace

std::uint64_t withheldSystemAuthorities() {
    return withheld;
}

}  // namespace fleet

struct ssl_ctx_st;

/// In the place of OpenSSL's function of that name, because the client library calls it without
/// asking. A program's own definition comes before that of a shared library.
extern "C" __attribute__((visibility("default"))) int SSL_CTX_set_default_verify_paths(
    ssl_ctx_st*) {
    ++fleet::withheld;
    return 1;
}
