# Points the shared out-of-process simulator at its own trees, sets faults and kills it.
set(TEST_SERIAL SERIAL)
set(TEST_RESTART_WINE RESTART_WINE)
set(TEST_TIMEOUT 180)
