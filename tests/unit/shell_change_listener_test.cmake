# The change listener of calvex-fetch --watch, from the tools' shell library.
set(TEST_LIBS calvex_tool_shell)
