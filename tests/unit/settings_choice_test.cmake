# What the settings window decides, without its window.
set(TEST_LIBS calvex_fetchw_face)
