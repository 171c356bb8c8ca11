# Points the shared out-of-process simulator at a tree of its own.
set(TEST_SERIAL SERIAL)
set(TEST_TIMEOUT 300)
