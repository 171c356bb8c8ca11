#pragma once
// The names under which a receiver file travels, all derived from its raw item path
// ("root\serial!model!port\file name as listed").
#include <string>

// What a drop target writes: the path's components from the third on, joined with "\";
// empty when the path has no file part.
std::wstring TransferFileName(const std::wstring& itemPath);
// What the device is asked for: the same, as the device manager knows it (FileDeviceName).
std::wstring DeviceFileName(const std::wstring& itemPath);
// What the progress text shows: the path's text after its last "\" or "/".
std::wstring ShownFileName(const std::wstring& itemPath);
