# The modem object and the registry (included by this directory's CMakeLists.txt).
add_vorn_test(usbmodem_test SOURCES usbmodem_test.cpp LIBS vornusbmodem-server vorn_fake_journal)
add_vorn_test(usbmodem_list_test SOURCES usbmodem_list_test.cpp LIBS vornusbmodem-server)
add_vorn_test(usbmodem_dial_test
              SOURCES usbmodem_dial_test.cpp ${PROJECT_SOURCE_DIR}/tests/e2e/usbmodem/e2e_support.cpp
              LIBS vornusbmodem-server vorn_fake_journal PkgConfig::GLIB TIMEOUT 300)
