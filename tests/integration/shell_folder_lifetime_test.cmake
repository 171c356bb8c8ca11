# Kills and unregisters the shared out-of-process simulator.
set(TEST_SERIAL SERIAL)
set(TEST_RESTART_WINE RESTART_WINE)
set(TEST_TIMEOUT 600)
