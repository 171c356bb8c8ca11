# Points the shared out-of-process simulator at trees of its own; 2,000 files list slowly.
set(TEST_SERIAL SERIAL)
set(TEST_TIMEOUT 900)
