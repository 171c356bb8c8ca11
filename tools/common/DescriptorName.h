#pragma once
// The names that a device hands out are hostile until proven otherwise: every name that is
// written below a target folder, by calvex-fetch and by calvex-paste, passes through here.
#include <cstddef>
#include <string>

// Appended to a file's name while its contents are still being written.
extern const wchar_t kPartialSuffix[];

// The longest path written, in characters: what Explorer's paste writes, and what calvex-fetch
// writes through extended paths (LongPath.h).
constexpr size_t kShortPathLimit = 259;
constexpr size_t kLongPathLimit = 32767 - 8;

// What becomes of a name: refused, taken as it stands, or made safe.
struct SafeName {
    bool refused = false;
    std::wstring name;    // relative to the target, components joined by "\"; empty when refused
    std::wstring reason;  // why it was refused or changed; empty when taken as it stands
};

// A descriptor name, which may hold sub-folders, to be written below a folder whose full path
// has targetLength characters. Refused: empty, absolute, drive or UNC prefix, an empty, "." or
// ".." component, a component that is nothing but dots and spaces, a name of more than 255
// characters (the last one with its temporary suffix), or a path below the target longer than
// pathLimit (the temporary suffix included). Made safe:
// control characters and characters that Windows does not allow in names become "_", trailing
// dots and spaces are removed, a reserved device name (CON, NUL, COM1, ...) gets a "_" prefix.
SafeName MakeSafeDescriptorName(const std::wstring& name, size_t targetLength, size_t pathLimit = kShortPathLimit);

// A single folder name made from a display name: separators become "_" as well
// ("Q7/RTK@COM3" gives "Q7_RTK@COM3"); otherwise the same rules.
SafeName MakeSafeFolderName(const std::wstring& displayName, size_t targetLength, size_t pathLimit = kShortPathLimit);
