# Target zav_crypto: SHA-256 for this build's width.
#
# Linked statically: of the whole library only the digest comes along, and a short verb of zavctl does
# not pay for loading the rest.
add_library(zav_crypto INTERFACE)
if(ZAV_LINK_UNPACKED_I386)
  zav_link_i386(zav_crypto libcrypto.a)
else()
  set(OPENSSL_USE_STATIC_LIBS TRUE)
  find_package(OpenSSL 3.0 REQUIRED COMPONENTS Crypto)
  target_link_libraries(zav_crypto INTERFACE OpenSSL::Crypto)
endif()
