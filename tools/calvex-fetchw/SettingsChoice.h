#pragma once
// What the settings window decides, apart from its window: which common layout a pattern is,
// whether a typed folder can take the files, and the live example of where a file would land.
#include <windows.h>

#include <string>
#include <vector>

#include "LayoutPattern.h"

class SettingsChoice {
public:
    struct Layout {
        const wchar_t* name;     // as the window lists it
        const wchar_t* pattern;  // null for a pattern of one's own
    };
    static const Layout kLayouts[];
    static const int kLayoutCount;
    static const int kOwnPattern;  // the index of "a pattern of my own"

    // The common layout that is exactly this pattern, else kOwnPattern.
    static int LayoutIndex(const std::wstring& pattern);
    // The pattern of a common layout; for kOwnPattern, what was typed.
    static std::wstring LayoutOf(int index, const std::wstring& typed);

    // Empty when the text has the form of a whole folder path, else the words why not.
    static std::wstring TargetFormProblem(const std::wstring& text);
    // Spaces around and a final "\" taken off (not the one of "D:\").
    static std::wstring TrimmedTarget(const std::wstring& text);

    enum class Target { Fine, Unusable, Missing };
    // Whether the folder is there and takes a new file; otherwise `problem` says why.
    static Target CheckTarget(const std::wstring& text, std::wstring& problem);

    // Where a file that the first connected receiver (else a sample one) logged at `logged` would
    // land: true with the example; false with the pattern's error, in --layout's words.
    static bool Example(const std::wstring& target, const std::wstring& layout,
                        const std::vector<LayoutReceiver>& connected, const SYSTEMTIME& logged, std::wstring& text);
    static LayoutReceiver SampleReceiver();
};
