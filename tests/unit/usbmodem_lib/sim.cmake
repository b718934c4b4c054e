# SIM handler and dial profile, against the modem simulator (vorn_modem_sim) on real
# pseudo-terminals. The binary runs under vorn-timewarp (given after the sandbox's "--"): the
# one-second waits of the unlock sequence and the node hand-over of a one-port dongle pass three
# times faster.
add_vorn_test(usbmodem_simhandler_test SOURCES usbmodem_simhandler_test.cpp LIBS vorn_modem_sim
              SANDBOX_ARGS -- ${PROJECT_SOURCE_DIR}/tests/sandbox/vorn-timewarp 3
              TIMEOUT 600)
# Under the time seam the dongle's 1 s reply timeout is a third of a second of real time; another
# test loading both cores (the sanitizer build above all) can make the simulator miss it. Nothing
# else runs beside it.
set_tests_properties(usbmodem_simhandler_test PROPERTIES RUN_SERIAL TRUE)
