#pragma once
// What the disk below a target folder can hold: how exactly it keeps a file's time, how much
// room is left, and whether the folder can be reached at all (a stick pulled, a share gone).
#include <windows.h>

#include <string>

// How exactly a disk keeps a file's last-write time.
enum class TimeKeeping {
    Seconds,     // NTFS, exFAT, and whatever else: to the second
    TwoSeconds,  // FAT12/16/32: even seconds, in local time
};

// The one rule by which a copy's time counts as the time wanted: equal to the second, or on a
// FAT disk within its two seconds, or exactly one hour off (within those two seconds) in a zone
// with a one-hour daylight saving change that year: FAT keeps local time, and the hour between
// the bias it was written with and the bias it is read with is no difference of the file.
bool SameTimeOnDisk(const FILETIME& onDisk, const FILETIME& wanted, TimeKeeping keeping);

class TargetDisk {
public:
    // The volume that holds folder (a full plain path; the folder need not exist yet).
    explicit TargetDisk(const std::wstring& folder);

    // The volume's root as the user knows it: "D:\", "\\server\share\".
    const std::wstring& Root() const { return m_root; }
    // Asked of the volume on the first call only: callers ask when a copy is a second or more
    // off (Wine warns on the console when asked for the volume of its root drive).
    TimeKeeping Keeping();
    // Bytes this user may still write there; false when the disk does not say.
    bool FreeBytes(ULONGLONG& free) const;
    // A time set on a file and read back another way, within what FAT makes of it: the disk
    // keeps two-second times whatever its file system's name says.
    void Learn(const FILETIME& set, const FILETIME& readBack);

    // S_OK when folder is a folder that can be reached now; else why not.
    static HRESULT Reach(const std::wstring& folder);

private:
    std::wstring m_root;
    TimeKeeping m_keeping = TimeKeeping::Seconds;
    bool m_known = false;
};
