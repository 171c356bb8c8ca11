# Points the shared out-of-process simulator at trees of its own.
set(TEST_SERIAL SERIAL)
set(TEST_TIMEOUT 180)
