#include "ConsoleText.h"

#include <windows.h>

std::string Utf8(const std::wstring& text) {
    const int n = WideCharToMultiByte(CP_UTF8, 0, text.data(), static_cast<int>(text.size()), nullptr, 0, nullptr, nullptr);
    std::string bytes(static_cast<size_t>(n > 0 ? n : 0), '\0');
    if (n > 0) WideCharToMultiByte(CP_UTF8, 0, text.data(), static_cast<int>(text.size()), &bytes[0], n, nullptr, nullptr);
    return bytes;
}

void WriteUtf8(FILE* stream, const std::wstring& text) {
    const std::string bytes = Utf8(text);
    fwrite(bytes.data(), 1, bytes.size(), stream);
    fflush(stream);
}
