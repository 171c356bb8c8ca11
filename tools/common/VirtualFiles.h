#pragma once
// Receiving virtual files ("FileGroupDescriptorW" + "FileContents") from a data object into a
// folder, as Explorer's paste does. Shared by the tools that copy files out of receivers.
#include <windows.h>
#include <objidl.h>
#include <shlobj.h>

#include <functional>
#include <string>
#include <vector>

#include "DescriptorName.h"
#include "TargetDisk.h"

// The data object's "FileGroupDescriptorW", one record per file.
HRESULT ReadFileDescriptors(IDataObject* data, std::vector<FILEDESCRIPTORW>& files);
// One file's "FileContents" as a stream (S_FALSE when the data object gives none). Asked of
// GetData directly: through a clipboard snapshot QueryGetData with an index fails.
HRESULT ReadFileContents(IDataObject* data, LONG index, IStream** stream);

// The moment a descriptor's write time names. Our data object gives the device's own clock,
// its local time, without a zone shift; read here as local time of that date (daylight saving
// included), so that the file shows the time the receiver logged it.
FILETIME DescriptorWriteTime(const FILEDESCRIPTORW& descriptor);

// The descriptor's size (both halves).
ULONGLONG DescriptorSize(const FILEDESCRIPTORW& descriptor);
// True when path is a file of the size and last-write time that the descriptor gives, the time
// as exactly as its disk keeps times (SameTimeOnDisk); what it does not give is not compared.
bool IsOnDiskAsDescribed(const std::wstring& path, const FILEDESCRIPTORW& descriptor, TargetDisk& disk);

// Writes the stream's remaining bytes as target\name, the name made safe or refused by
// MakeSafeDescriptorName (DescriptorName.h): to a temporary name first, then the size is
// checked against the descriptor, the write time set and the file flushed to the disk; it is
// renamed with write-through and read back under its final name: S_OK means that the file
// flushed is the one in place, whole. With IsOnDiskAsDescribed that proves a copy (a time
// that the disk cannot hold is not the descriptor's). Nothing is left behind on failure;
// error says why ("the disk is full (0x80070070)" when the disk refused the rest).
HRESULT WriteVirtualFile(const std::wstring& targetDir, const FILEDESCRIPTORW& descriptor, IStream* stream,
                         std::wstring& error, size_t pathLimit = kShortPathLimit);

// One line of progress or failure for the user.
using PasteReport = std::function<void(const std::wstring& line)>;

// Reads the descriptor, then each file's contents by index, and writes every file. Returns the
// number of files written; failed is the number that were not.
int PasteVirtualFiles(IDataObject* data, const std::wstring& targetDir, const PasteReport& report, int& failed);
