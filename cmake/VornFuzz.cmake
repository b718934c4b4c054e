# The fuzz build (-DVORN_FUZZ=ON, clang only): every target of ours is compiled with coverage
# instrumentation and the sanitizers; add_vorn_fuzzer() adds one libFuzzer executable.

if(VORN_FUZZ)
  if(NOT CMAKE_CXX_COMPILER_ID STREQUAL "Clang")
    message(FATAL_ERROR "VORN_FUZZ needs clang: configure with -DCMAKE_C_COMPILER=clang "
                        "-DCMAKE_CXX_COMPILER=clang++")
  endif()
  add_compile_options(-fsanitize=fuzzer-no-link,address,undefined -fno-omit-frame-pointer
                      -fno-sanitize-recover=undefined)
  add_link_options(-fsanitize=address,undefined)
endif()

# add_vorn_fuzzer(<name> SOURCES <files...> [LIBS <libs...>] [DEFINES <defs...>])
# A libFuzzer executable fuzz-<name>; its seeds live in fuzz/corpus/<name>/ and its dictionary,
# when there is one, in fuzz/dict/<name>.dict (bench/fuzz/run finds both by the name).
function(add_vorn_fuzzer name)
  cmake_parse_arguments(F "" "" "SOURCES;LIBS;DEFINES" ${ARGN})
  add_executable(fuzz-${name} ${F_SOURCES})
  vorn_target_warnings(fuzz-${name})
  target_link_options(fuzz-${name} PRIVATE -fsanitize=fuzzer)
  target_link_libraries(fuzz-${name} PRIVATE vornusbmodem-server ${F_LIBS})
  target_include_directories(fuzz-${name} PRIVATE ${PROJECT_SOURCE_DIR}/fuzz
                             ${PROJECT_SOURCE_DIR}/tests)
  if(F_DEFINES)
    target_compile_definitions(fuzz-${name} PRIVATE ${F_DEFINES})
  endif()
  set_property(GLOBAL APPEND PROPERTY VORN_FUZZERS fuzz-${name})
endfunction()

# The methods of the two services in table order (fuzz target names and the bus test's list).
set(VORN_FUZZ_NET_METHODS GetDeviceListData SetDeviceListData DelDeviceListData
    GetGatewayListData AddGatewayData DelGatewayData GetGatewayDataByInterface SetSlaveData
    CopyGatewayData RefreshGateway ResetIPv6Module)
set(VORN_FUZZ_USBMODEM_METHODS Connect Disconnect GetUSBModemList GetUSBModem GetSimInfo
    UnlockSIM SetPIN GetProfile SetProfile UnlockPIN GetUSBModemIfList GetDevIdByIfName)
