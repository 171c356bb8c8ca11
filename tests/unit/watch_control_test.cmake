set(TEST_LIBS calvex_fetch_core)
