# The receiving side of virtual files that calvex-fetch and calvex-paste share.
set(TEST_LIBS calvex_virtual_files)
