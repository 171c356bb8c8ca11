# Points the shared out-of-process simulator at a tree of its own and kills it once.
set(TEST_SERIAL SERIAL)
set(TEST_RESTART_WINE RESTART_WINE)
set(TEST_TIMEOUT 400)
set(TEST_LIBS calvex_virtual_files)  # reads the descriptors as calvex-paste does
