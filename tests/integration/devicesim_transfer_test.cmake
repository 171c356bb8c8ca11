# Points the shared out-of-process simulator at trees of its own, sets faults and ends it.
set(TEST_SERIAL SERIAL)
set(TEST_TIMEOUT 180)
