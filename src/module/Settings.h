#pragma once
#include <windows.h>
#include "module/ModuleState.h"

// Per-user value "Display Settings" (REG_BINARY) under this key: the widths of the first two
// view columns, kept between loads of the module.
extern const wchar_t kSettingsKey[];
extern const wchar_t kDisplaySettingsValue[];

// Sets both widths to 100, then takes the stored ones when a value of at most 16 bytes is
// there. Returns false (defaults kept) when the key or value is missing or too long.
bool ReadDisplaySettings(DisplayState& state);
// Stores the two widths as 12 bytes (the third word is 0). Returns whether it was written.
bool WriteDisplaySettings(const DisplayState& state);
