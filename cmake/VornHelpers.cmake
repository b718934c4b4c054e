# Warnings and sanitizer flags for our own targets, and the one helper that adds a test.

set(VORN_WARNINGS -Wall -Wextra -Werror -Werror=switch)

if(VORN_SANITIZE)
  add_compile_options(-fsanitize=address,undefined -fno-omit-frame-pointer -fno-sanitize-recover=undefined)
  add_link_options(-fsanitize=address,undefined)
  # g++ 12 reports false maybe-uninitialized warnings inside <regex> at -O2 with the sanitizers.
  list(APPEND VORN_WARNINGS -Wno-maybe-uninitialized)
endif()

# Applies our warning set to a target of ours (never to generated or third-party code).
function(vorn_target_warnings target)
  target_compile_options(${target} PRIVATE ${VORN_WARNINGS})
endfunction()

# add_vorn_test(<name> SOURCES <files...> [LIBS <libs...>] [NO_SANDBOX] [DBUS] [TIMEOUT <s>] [LABELS <l...>])
# One executable and one ctest entry per test file. By default the test runs as PID 1 of a fresh
# sandbox (tests/sandbox/vorn-sandbox), so it may write /usr/vorn, /etc and /var/lib freely and its
# syslog lines are caught; DBUS starts the sandbox's private bus as well.
function(add_vorn_test name)
  cmake_parse_arguments(T "NO_SANDBOX;DBUS" "TIMEOUT" "SOURCES;LIBS;LABELS;SANDBOX_ARGS" ${ARGN})
  add_executable(${name} ${T_SOURCES})
  vorn_target_warnings(${name})
  target_link_libraries(${name} PRIVATE vorn_test_main ${T_LIBS})
  if(T_NO_SANDBOX)
    add_test(NAME ${name} COMMAND $<TARGET_FILE:${name}>)
  else()
    set(sbargs)
    if(NOT T_DBUS)
      list(APPEND sbargs --no-dbus)
    endif()
    add_test(NAME ${name}
             COMMAND ${VORN_SANDBOX} ${sbargs} ${T_SANDBOX_ARGS} -- $<TARGET_FILE:${name}>)
  endif()
  if(NOT T_TIMEOUT)
    set(T_TIMEOUT 120)
  endif()
  set_tests_properties(${name} PROPERTIES TIMEOUT ${T_TIMEOUT}
    ENVIRONMENT "VORN_SOURCE_DIR=${PROJECT_SOURCE_DIR};VORN_BINARY_DIR=${PROJECT_BINARY_DIR};ASAN_OPTIONS=detect_leaks=1:verify_asan_link_order=0;UBSAN_OPTIONS=print_stacktrace=1:halt_on_error=1")
  if(T_LABELS)
    set_tests_properties(${name} PROPERTIES LABELS "${T_LABELS}")
  endif()
endfunction()
