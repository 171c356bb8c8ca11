#include "items/ItemTexts.h"

#include <oleauto.h>
#include <cstdio>

#include "com/Bstr.h"
#include "module/ModuleState.h"
#include "resources/resource.h"

namespace {
const size_t kWorkBufferLength = 260;

// The Microsoft CRT's formatting (not MinGW's C99 one), as the string table's formats expect.
template <class Value>
std::wstring FormatResource(UINT id, Value value) {
    std::wstring format = LoadModuleString(id);
    wchar_t text[kWorkBufferLength] = L"";
    _snwprintf(text, kWorkBufferLength - 1, format.c_str(), value);
    text[kWorkBufferLength - 1] = L'\0';
    return text;
}
}  // namespace

std::wstring FormatFileSize(DWORD size) {
    // Widened first: the size is unsigned and sizes above 2 GB must not turn negative.
    const ULONGLONG bytes = size;
    if (bytes < 1024) return FormatResource(IDS_SIZE_BYTES, static_cast<int>(bytes));
    const double kb = static_cast<double>(bytes) / 1024;
    if (kb < 1024) return FormatResource(IDS_SIZE_KB, kb);
    const double mb = kb / 1024;
    if (mb < 1024) return FormatResource(IDS_SIZE_MB, mb);
    return FormatResource(IDS_SIZE_GB, mb / 1024);
}

std::wstring FormatFileTime(DATE time) {
    Bstr text;
    if (SUCCEEDED(VarBstrFromDate(time, LOCALE_USER_DEFAULT, 0, text.Put()))) return text.Str();
    // The module defines no string 55296: the fallback text is what shows.
    std::wstring invalid = LoadModuleString(IDS_INVALID_DATETIME);
    return invalid.empty() ? std::wstring(L"Invalid DateTime") : invalid;
}
