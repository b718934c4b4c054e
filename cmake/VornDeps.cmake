# Every dependency is a Debian 12 package (scripts/install-deps).
find_package(PkgConfig REQUIRED)
find_package(Threads REQUIRED)
pkg_check_modules(GLIB REQUIRED IMPORTED_TARGET glib-2.0 gobject-2.0 gio-2.0 gio-unix-2.0)
pkg_check_modules(JSONCPP REQUIRED IMPORTED_TARGET jsoncpp)
pkg_check_modules(UPNP REQUIRED IMPORTED_TARGET libupnp)
find_package(OpenSSL REQUIRED COMPONENTS Crypto)
find_package(Boost REQUIRED)

# WvStreams ships no pkg-config file; its headers raise warnings, so they are SYSTEM headers.
find_library(WVSTREAMS_LIB wvstreams REQUIRED)
find_library(WVUTILS_LIB wvutils REQUIRED)
find_library(WVBASE_LIB wvbase REQUIRED)
add_library(vorn::wvstreams INTERFACE IMPORTED)
target_link_libraries(vorn::wvstreams INTERFACE ${WVSTREAMS_LIB} ${WVUTILS_LIB} ${WVBASE_LIB})
target_include_directories(vorn::wvstreams SYSTEM INTERFACE /usr/include/wvstreams)
