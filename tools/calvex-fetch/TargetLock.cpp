#include "TargetLock.h"

#include <cstdio>
#include <vector>

#include "LongPath.h"

std::wstring TargetLockName(const std::wstring& target) {
    // The same folder by its short or its long names, however deep: one lock.
    const std::wstring extended = LongPath(target);
    std::vector<wchar_t> longPath(extended.size() + MAX_PATH);
    const DWORD length = GetLongPathNameW(extended.c_str(), longPath.data(), static_cast<DWORD>(longPath.size()));
    std::wstring path = FullPlainPath(length && length < longPath.size() ? std::wstring(longPath.data(), length) : target);
    while (path.size() > 3 && (path.back() == L'\\' || path.back() == L'/')) path.pop_back();
    CharUpperBuffW(&path[0], static_cast<DWORD>(path.size()));
    unsigned long long hash = 14695981039346656037ull;  // FNV-1a over the UTF-16 units
    for (wchar_t c : path) {
        if (c == L'/') c = L'\\';
        hash = (hash ^ static_cast<unsigned>(c)) * 1099511628211ull;
    }
    wchar_t name[48];
    swprintf(name, 48, L"Global\\calvex-fetch-%016llX", hash);
    return name;
}

bool TargetLock::Acquire(const std::wstring& target) {
    // Another user's watch on a shared folder holds a mutex this user may not open: that
    // fails with access denied, and refuses just the same.
    m_mutex.Reset(CreateMutexW(nullptr, TRUE, TargetLockName(target).c_str()));
    if (m_mutex && GetLastError() != ERROR_ALREADY_EXISTS) return true;
    m_mutex.Reset();
    return false;
}
