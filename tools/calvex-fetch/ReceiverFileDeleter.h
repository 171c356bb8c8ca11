#pragma once
// --move's last step: delete a file on its receiver, but only when the receiver, asked again
// right now, still reports the size and time that the copy was proven against.
//
// It goes through the device manager contract, as the extension's own Delete command does
// (the file found by its device name in the receiver's files, then IReceiverFile::Delete),
// not through the shell: the namespace deletes only from its view, behind an error box, and
// its items carry the size and time they had when listed, so only the device manager can be
// asked again just before the delete.
#include <windows.h>
#include <shlobj.h>

#include <string>

#include "CalvexDeviceMgrLib.h"
#include "ReceiverList.h"
#include "com/ComPtr.h"

class ReceiverFileDeleter {
public:
    enum class Outcome { Deleted, Changed, Refused };

    explicit ReceiverFileDeleter(const Receiver& receiver);

    // The file that the descriptor describes (its name as the namespace shows it, its size
    // and the receiver's own time); why holds the failure when Refused.
    Outcome Delete(const FILEDESCRIPTORW& descriptor, HRESULT& why);

private:
    HRESULT OpenFiles();
    HRESULT FindFile(const std::wstring& shownName, ComPtr<IReceiverFile>& file);

    std::wstring m_lookupKey;  // "port-serial", as the device manager finds a receiver
    bool m_showsExtension;     // the namespace shows the receiver's files with ".qpr"
    ComPtr<IFilesColl> m_files;  // opened on the first delete, for this pass over the receiver
};

// True when the receiver's report of a file (size, time as an OLE date of its own clock) is
// what the descriptor says.
bool ReportMatchesDescriptor(long size, DATE time, const FILEDESCRIPTORW& descriptor);
