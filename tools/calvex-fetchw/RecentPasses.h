#pragma once
// The last passes the watch spoke of, newest first, for the icon's "Recent" menu: each its
// notice, its time and the folder it filled. Kept in memory only: a new start begins empty.
#include <windows.h>

#include <deque>
#include <string>

struct RecentPass {
    std::wstring notice;  // as the log has it
    SYSTEMTIME at = {};   // local time
    std::wstring folder;  // what choosing it opens
};

class RecentPasses {
public:
    static constexpr size_t kKept = 10;

    void Add(const RecentPass& pass);
    const std::deque<RecentPass>& Newest() const { return m_passes; }

private:
    std::deque<RecentPass> m_passes;
};

// The pass's menu item: its notice, a tab, and its time ("15:30", or with the date when not of
// the day `today`); "&" doubled, so that it shows as itself.
std::wstring RecentMenuText(const RecentPass& pass, const SYSTEMTIME& today);
