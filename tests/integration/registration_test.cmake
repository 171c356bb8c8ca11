# Registers and unregisters the module in the shared prefix: nothing else may run meanwhile.
set(TEST_SERIAL SERIAL)
