# Kills, unregisters and re-points the shared out-of-process simulator; pastes through the
# tools' virtual-file writer.
set(TEST_SERIAL SERIAL)
set(TEST_RESTART_WINE RESTART_WINE)
set(TEST_TIMEOUT 600)
set(TEST_LIBS calvex_virtual_files)
