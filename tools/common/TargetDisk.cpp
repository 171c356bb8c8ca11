#include "TargetDisk.h"

#include <vector>

#include "LongPath.h"

namespace {
constexpr LONGLONG kSecond = 10000000;  // FILETIME ticks
constexpr LONGLONG kHour = 3600 * kSecond;

LONGLONG Ticks(const FILETIME& time) {
    return static_cast<LONGLONG>((static_cast<ULONGLONG>(time.dwHighDateTime) << 32) | time.dwLowDateTime);
}

bool WithinTwoSeconds(LONGLONG difference) { return difference > -2 * kSecond && difference < 2 * kSecond; }

// The zone's daylight saving that year is one hour: what FAT's local times can be off by.
bool HasDaylightSavingHour(const FILETIME& moment) {
    SYSTEMTIME day;
    TIME_ZONE_INFORMATION zone;
    if (!FileTimeToSystemTime(&moment, &day) || !GetTimeZoneInformationForYear(day.wYear, nullptr, &zone)) return false;
    return zone.DaylightDate.wMonth != 0 && zone.DaylightBias - zone.StandardBias == -60;
}

// The tests' stand-in for a FAT volume, which none of their machines can mount: the file
// system's name as the volume would give it.
std::wstring FileSystemName(const std::wstring& root) {
    wchar_t name[MAX_PATH + 1] = L"";
    const DWORD length = GetEnvironmentVariableW(L"CALVEX_FETCH_FILE_SYSTEM", name, MAX_PATH + 1);
    if (length && length <= MAX_PATH) return name;
    if (!GetVolumeInformationW(root.c_str(), nullptr, 0, nullptr, nullptr, nullptr, name, MAX_PATH + 1)) return L"";
    return name;
}

std::wstring VolumeRoot(const std::wstring& folder) {
    std::vector<wchar_t> root(folder.size() + 2);
    if (GetVolumePathNameW(folder.c_str(), root.data(), static_cast<DWORD>(root.size()))) return root.data();
    if (folder.size() >= 2 && folder[1] == L':') return folder.substr(0, 2) + L"\\";
    return folder;
}
}  // namespace

bool SameTimeOnDisk(const FILETIME& onDisk, const FILETIME& wanted, TimeKeeping keeping) {
    if (keeping == TimeKeeping::Seconds) return Ticks(onDisk) / kSecond == Ticks(wanted) / kSecond;
    const LONGLONG difference = Ticks(onDisk) - Ticks(wanted);
    if (WithinTwoSeconds(difference)) return true;
    return (WithinTwoSeconds(difference - kHour) || WithinTwoSeconds(difference + kHour)) && HasDaylightSavingHour(wanted);
}

TargetDisk::TargetDisk(const std::wstring& folder) : m_root(VolumeRoot(folder)) {}

TimeKeeping TargetDisk::Keeping() {
    if (m_known) return m_keeping;
    m_known = true;
    const std::wstring name = FileSystemName(m_root);
    for (const wchar_t* fat : {L"FAT", L"FAT12", L"FAT16", L"FAT32"})
        if (CompareStringOrdinal(name.c_str(), -1, fat, -1, TRUE) == CSTR_EQUAL) m_keeping = TimeKeeping::TwoSeconds;
    return m_keeping;
}

bool TargetDisk::FreeBytes(ULONGLONG& free) const {
    ULARGE_INTEGER available = {};
    if (!GetDiskFreeSpaceExW(m_root.c_str(), &available, nullptr, nullptr)) return false;
    free = available.QuadPart;
    return true;
}

void TargetDisk::Learn(const FILETIME& set, const FILETIME& readBack) {
    if (SameTimeOnDisk(readBack, set, TimeKeeping::Seconds) || !SameTimeOnDisk(readBack, set, TimeKeeping::TwoSeconds)) return;
    m_keeping = TimeKeeping::TwoSeconds;
    m_known = true;
}

HRESULT TargetDisk::Reach(const std::wstring& folder) {
    const DWORD attributes = GetFileAttributesW(LongPath(folder).c_str());
    if (attributes == INVALID_FILE_ATTRIBUTES) return HRESULT_FROM_WIN32(GetLastError());
    return attributes & FILE_ATTRIBUTE_DIRECTORY ? S_OK : HRESULT_FROM_WIN32(ERROR_DIRECTORY);
}
