#pragma once
// The process-wide trace file "CalvexReceiversShellExt.log" in the user's temporary
// directory. Always on; every failure of it is silent.
#include <windows.h>

void OpenTraceLog();
void CloseTraceLog();
void WriteTracePrefix();
// printf-style; the message carries its own line end. %s is a narrow string in TraceA and a
// wide string in TraceW (the Microsoft convention for the wide functions).
void TraceA(const char* format, ...);
void TraceW(const wchar_t* format, ...);
