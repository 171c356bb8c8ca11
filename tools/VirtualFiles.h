#pragma once
// Receiving virtual files ("FileGroupDescriptorW" + "FileContents") from a data object into a
// folder, as Explorer's paste does. Shared by the tools that copy files out of receivers.
#include <windows.h>
#include <objidl.h>
#include <shlobj.h>

#include <functional>
#include <string>

// A descriptor name that stays inside the target: relative, no drive, no "." or ".."
// component, not empty.
bool IsSafeDescriptorName(const std::wstring& name);

// Writes the stream's remaining bytes as target\name: to a temporary name first, then the
// size is checked against the descriptor and the write time set, then it is renamed. Nothing
// is left behind on failure; error says why.
HRESULT WriteVirtualFile(const std::wstring& targetDir, const FILEDESCRIPTORW& descriptor, IStream* stream,
                         std::wstring& error);

// One line of progress or failure for the user.
using PasteReport = std::function<void(const std::wstring& line)>;

// Reads the descriptor, then each file's contents by index, and writes every file. Returns the
// number of files written; failed is the number that were not.
int PasteVirtualFiles(IDataObject* data, const std::wstring& targetDir, const PasteReport& report, int& failed);
