#pragma once
// Text for the console or a pipe: UTF-8 whatever the console's code page, so names survive.
#include <cstdio>
#include <string>

std::string Utf8(const std::wstring& text);
void WriteUtf8(FILE* stream, const std::wstring& text);
