# Points the shared out-of-process simulator at trees of its own and unregisters it once.
set(TEST_SERIAL SERIAL)
set(TEST_TIMEOUT 900)
