# Target zav_nats: the client of the fleet's bus. Target zav_sodium: its keys and signatures. Target
# zav_shared_crypto: certificates for TLS, and zav_shared_tls: TLS itself, by the same libraries as the bus's
# client uses. A program with those and static ones would mix them, so what links zav_nats never links
# zav_crypto.
#
# Only the machine's own width has them: no link between a host and a fleet is built for another one.
find_path(ZAV_NATS_INCLUDE nats/nats.h)
find_library(ZAV_NATS_LIBRARY nats)
find_path(ZAV_SODIUM_INCLUDE sodium.h)
find_library(ZAV_SODIUM_LIBRARY sodium)
find_library(ZAV_SHARED_LIBCRYPTO crypto)
find_library(ZAV_SHARED_LIBSSL ssl)
foreach(needed NATS SODIUM)
  if(NOT ZAV_${needed}_INCLUDE OR NOT ZAV_${needed}_LIBRARY)
    message(FATAL_ERROR "libnats or libsodium is missing: run scripts/bootstrap.sh")
  endif()
endforeach()
add_library(zav_nats INTERFACE)
target_include_directories(zav_nats SYSTEM INTERFACE ${ZAV_NATS_INCLUDE})
target_link_libraries(zav_nats INTERFACE ${ZAV_NATS_LIBRARY})
add_library(zav_sodium INTERFACE)
target_include_directories(zav_sodium SYSTEM INTERFACE ${ZAV_SODIUM_INCLUDE})
target_link_libraries(zav_sodium INTERFACE ${ZAV_SODIUM_LIBRARY})
foreach(library LIBCRYPTO LIBSSL)
  if(NOT ZAV_SHARED_${library} MATCHES "\\.so$")
    message(FATAL_ERROR "The shared libcrypto or libssl is missing: run scripts/bootstrap.sh")
  endif()
endforeach()
add_library(zav_shared_crypto INTERFACE)
target_link_libraries(zav_shared_crypto INTERFACE ${ZAV_SHARED_LIBCRYPTO})
add_library(zav_shared_tls INTERFACE)
target_link_libraries(zav_shared_tls INTERFACE ${ZAV_SHARED_LIBSSL} zav_shared_crypto)
