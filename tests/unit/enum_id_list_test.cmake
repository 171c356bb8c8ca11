# The simulated device manager's objects, made in this process.
set(TEST_LIBS calvex_devicesim_core)
