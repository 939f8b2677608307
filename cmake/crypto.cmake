# Target zav_crypto: SHA-256 for this build's width.
#
# Linked statically: of the whole library only the digest comes along, and a short verb of zavctl does
# not pay for loading the rest. For i686 see expat.cmake.
add_library(zav_crypto INTERFACE)
if(CMAKE_SIZEOF_VOID_P EQUAL 4)
  find_library(ZAV_CRYPTO_I386 libcrypto.a
    PATHS ${ZAV_I386_ROOT}/usr/lib/i386-linux-gnu NO_DEFAULT_PATH)
  if(NOT ZAV_CRYPTO_I386)
    message(FATAL_ERROR "No 32-bit libcrypto below ${ZAV_I386_ROOT}: run scripts/bootstrap.sh")
  endif()
  target_include_directories(zav_crypto SYSTEM INTERFACE ${ZAV_I386_ROOT}/usr/include
    ${ZAV_I386_ROOT}/usr/include/i386-linux-gnu)
  target_link_libraries(zav_crypto INTERFACE ${ZAV_CRYPTO_I386})
else()
  set(OPENSSL_USE_STATIC_LIBS TRUE)
  find_package(OpenSSL 3.0 REQUIRED COMPONENTS Crypto)
  target_link_libraries(zav_crypto INTERFACE OpenSSL::Crypto)
endif()
