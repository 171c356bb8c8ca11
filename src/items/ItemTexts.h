#pragma once
// The texts of a file item's Size and Time columns.
#include <windows.h>
#include <string>

// "%d bytes" below 1024, then "%.1f KB", "%.1f MB", "%.1f GB" in steps of 1024, formats
// from the module's string table.
std::wstring FormatFileSize(DWORD size);

// The user's short date and time, or "Invalid DateTime" when the date cannot be converted.
std::wstring FormatFileTime(DATE time);
