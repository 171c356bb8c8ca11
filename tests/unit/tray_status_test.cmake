set(TEST_LIBS calvex_fetchw_face)
