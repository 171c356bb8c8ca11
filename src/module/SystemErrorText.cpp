#include "module/SystemErrorText.h"

namespace {
std::wstring SystemMessage(HRESULT result) {
    wchar_t* text = nullptr;
    const DWORD length = FormatMessageW(FORMAT_MESSAGE_ALLOCATE_BUFFER | FORMAT_MESSAGE_FROM_SYSTEM |
                                            FORMAT_MESSAGE_IGNORE_INSERTS,
                                        nullptr, static_cast<DWORD>(result), 0, reinterpret_cast<LPWSTR>(&text), 0,
                                        nullptr);
    std::wstring message = text && length ? std::wstring(text, length) : std::wstring();
    if (text) LocalFree(text);
    return message;
}

std::wstring CodeText(HRESULT result) {
    wchar_t code[32];
    wsprintfW(code, L"Error 0x%08X", static_cast<unsigned>(result));
    return code;
}
}  // namespace

std::wstring SystemErrorText(HRESULT result) {
    const std::wstring message = SystemMessage(result);
    return message.empty() ? CodeText(result) : message;
}

std::wstring SystemErrorTextWithCode(HRESULT result) {
    std::wstring message = SystemMessage(result);
    while (!message.empty() && (message.back() == L'\n' || message.back() == L'\r')) message.pop_back();
    return message.empty() ? CodeText(result) : message + L"\r\n" + CodeText(result);
}
