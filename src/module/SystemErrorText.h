#pragma once
// The system's text for a result code, as the extension's error boxes show it.
#include <windows.h>

#include <string>

// The system's message as it stands (its line end included), or "Error 0x%08X" when the
// system has none.
std::wstring SystemErrorText(HRESULT result);
// The system's message without its line end, then a line with "Error 0x%08X"; the code's line
// alone when the system has no message.
std::wstring SystemErrorTextWithCode(HRESULT result);
