#pragma once
// The textual forms of item positions: item paths ("root\serial!model!port\file") and
// receiver keys ("serial!model!port"). Every reader and writer of these texts goes through
// these helpers, so that paths and keys are split the same way everywhere.
#include <string>
#include <vector>

// Components of an item path. "\" and "/" both separate; empty components are dropped, so
// leading, trailing and doubled separators do not count. A null path has no component.
std::vector<std::wstring> SplitItemPath(const wchar_t* path);

// Joins parts[first..] with "\" (a file name that held separators is kept whole this way).
std::wstring JoinItemPath(const std::vector<std::wstring>& parts, size_t first);

// Fields of a receiver key, split at every "!". Empty fields are kept: a field's position
// says what it is (1 serial number, 2 model, 3 port text).
std::vector<std::wstring> SplitReceiverKey(const wchar_t* key);

// The key stores "/" of a model as "#", so that a model cannot split a path.
std::wstring ModelToKeyField(const std::wstring& model);
std::wstring ModelFromKeyField(const std::wstring& field);

// serial + "!" + model (with "/" as "#") + "!" + port text.
std::wstring MakeReceiverKey(const std::wstring& serial, const std::wstring& model,
                             const std::wstring& portText);

// The text by which the device manager finds a receiver: port text "-" serial number, taken
// from a receiver key of exactly three fields; any other key gives the empty text.
std::wstring ReceiverLookupKey(const wchar_t* receiverKey);
