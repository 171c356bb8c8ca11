#pragma once
// The words of the watch's notification area icon: the notice after a receiver's pass (also a
// line of the log) and the icon's tooltip. A notice says no more than the pass proved: "Safe to
// unplug." only when nothing of the receiver is missing from the target.
#include <string>

#include "ReceiverPass.h"

// What fits the shell's fields: NOTIFYICONDATAW's szTip and szInfo, less their terminator.
constexpr size_t kTipLimit = 127;
constexpr size_t kNoticeLimit = 255;

// "Q9 GNSS@USB: 12 files in D:\Survey, 12 deleted from the receiver. Safe to unplug."
std::wstring PassNotice(const ReceiverPass& pass);
// The same in a balloon: what is where on one line, the advice on the next.
std::wstring PassBalloon(const ReceiverPass& pass);
// "calvex-fetch: watching D:\Survey"
std::wstring IdleTip(const std::wstring& target);
// "calvex-fetch: Q9 GNSS@USB, 5 files left"
std::wstring WorkingTip(const std::wstring& receiver, int left);
// At most `limit` characters, ending in "..." when cut; never half of a surrogate pair.
std::wstring CutText(const std::wstring& text, size_t limit);
