#include "WatchNotice.h"

namespace {
std::wstring Count(int count, const wchar_t* one, const wchar_t* many) {
    return std::to_wstring(count) + L" " + (count == 1 ? one : many);
}

std::wstring Failures(const ReceiverPass& pass) {
    std::wstring text = std::to_wstring(pass.failed) + L" failed";
    if (pass.firstFailure.empty()) return text;
    const int others = pass.failed - 1;
    return text + L" (" + pass.firstFailure + (others > 0 ? L", and " + Count(others, L"other", L"others") : L"") + L")";
}

// What is where now: in the target, deleted, left on the receiver, failed.
std::wstring Counts(const ReceiverPass& pass) {
    if (!pass.files && !pass.failed && !pass.deleted && !pass.kept && !pass.unplugged) return L"no files on the receiver";
    std::wstring text = pass.files ? Count(pass.files, L"file", L"files") : std::wstring(L"no files");
    text += L" in " + pass.target;
    if (pass.deleted) text += L", " + std::to_wstring(pass.deleted) + L" deleted from the receiver";
    if (pass.kept) text += L", " + std::to_wstring(pass.kept) + L" left on the receiver";
    if (pass.failed) text += L", " + Failures(pass);
    return text;
}

std::wstring Advice(const ReceiverPass& pass) {
    if (pass.unplugged) return L"Unplugged before the end: the rest comes when it is plugged in again.";
    if (pass.failed) return pass.failed == 1 ? L"Unplug only after it is fetched." : L"Unplug only after they are fetched.";
    return L"Safe to unplug.";
}
}  // namespace

std::wstring PassNotice(const ReceiverPass& pass) { return pass.receiver + L": " + Counts(pass) + L". " + Advice(pass); }

// Each line ends in a space: Wine's balloon measures its text one character short and would cut
// the last one off (Windows does not show it).
std::wstring PassBalloon(const ReceiverPass& pass) {
    return pass.receiver + L": " + Counts(pass) + L". \n" + Advice(pass) + L" ";
}

std::wstring IdleTip(const std::wstring& target) { return L"calvex-fetch: watching " + target; }

std::wstring WorkingTip(const std::wstring& receiver, int left) {
    if (left <= 0) return L"calvex-fetch: looking at " + receiver;
    return L"calvex-fetch: " + receiver + L", " + Count(left, L"file", L"files") + L" left";
}

std::wstring CutText(const std::wstring& text, size_t limit) {
    if (text.size() <= limit) return text;
    const std::wstring dots = L"...";
    if (limit < dots.size()) return dots.substr(0, limit);
    size_t keep = limit - dots.size();
    if (keep && text[keep - 1] >= 0xD800 && text[keep - 1] <= 0xDBFF) --keep;  // the pair goes whole
    return text.substr(0, keep) + dots;
}
