#pragma once
// Paths past MAX_PATH: project folders synced from a cloud drive reach 260 characters with a
// dated layout and a file's name. Every call that touches the target's files takes the
// extended form ("\\?\C:\...", "\\?\UNC\server\share\..."); users are shown the plain one.
#include <string>

// The extended form of a full, plain path ("C:\x", "\\server\share\x"); one already extended,
// or one that is not full, is returned as it stands.
std::wstring LongPath(const std::wstring& path);

// The plain form of path made full (GetFullPathNameW, without a length limit), without
// trailing separators beyond a root's; path itself when it cannot be made full.
std::wstring FullPlainPath(const std::wstring& path);
