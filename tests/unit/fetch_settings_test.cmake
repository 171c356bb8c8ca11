# The stored settings of calvex-fetchw, on a scratch key of the test prefix.
set(TEST_LIBS calvex_fetchw_face)
