set(TEST_LIBS calvex_devicesim_core)
