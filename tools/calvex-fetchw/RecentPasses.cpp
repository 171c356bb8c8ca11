#include "RecentPasses.h"

#include "TrayStatus.h"
#include "WatchNotice.h"

namespace {
constexpr size_t kMenuNoticeLimit = 120;  // a menu as wide as the screen helps nobody
}

void RecentPasses::Add(const RecentPass& pass) {
    m_passes.push_front(pass);
    if (m_passes.size() > kKept) m_passes.pop_back();
}

std::wstring RecentMenuText(const RecentPass& pass, const SYSTEMTIME& today) {
    std::wstring text;
    for (wchar_t c : CutText(pass.notice, kMenuNoticeLimit)) text += c == L'&' ? std::wstring(L"&&") : std::wstring(1, c);
    return text + L"\t" + ClockText(pass.at, today);
}
