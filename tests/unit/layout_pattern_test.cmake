# calvex-fetch's --layout patterns, without the shell.
set(TEST_LIBS calvex_fetch_core)
