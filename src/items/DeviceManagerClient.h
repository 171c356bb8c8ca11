#pragma once
// The typed client of the device manager service. Every call that the extension makes into
// the service goes through here: one function per step, each with the query for the
// interface that the caller needs next. Results are the service's own; an object that a
// call did not hand out is E_POINTER where the caller needs one. What a failure means (an
// empty folder, a trace line, an error box, E_INVALIDARG) stays each caller's decision.
#include <windows.h>
#include <objidl.h>

#include <string>

#include "CalvexDeviceMgrLib.h"
#include "com/ComPtr.h"

// A service object of the caller's own: no connection is shared or cached.
HRESULT CreateDeviceManager(ComPtr<IDeviceMgr>& manager);
// get_Receivers and the query for IReceiversColl: the object as it was handed out (a brand
// folder's event source) and the collection.
HRESULT GetReceivers(IDeviceMgr* manager, ComPtr<IDispatch>& object, ComPtr<IReceiversColl>& receivers);

// The collection that a bound folder holds, as receivers or as files; E_NOINTERFACE for none.
HRESULT QueryReceiversColl(IUnknown* object, ComPtr<IReceiversColl>& receivers);
HRESULT QueryFilesColl(IUnknown* object, ComPtr<IFilesColl>& files);

// get_ItemByKey with a lookup key (ReceiverLookupKey of ItemPath.h).
HRESULT GetReceiverByKey(IReceiversColl* receivers, BSTR lookupKey, ComPtr<IDispatch>& receiver);
// The query for IReceiver, then get_Files; the files object may be missing on success.
HRESULT GetReceiverFiles(IDispatch* object, ComPtr<IReceiver>& receiver, ComPtr<IDispatch>& files);

// Enumeration: get_Count as the service answers it (0 when it does not), get_Item as the
// item's own interface.
template <class Collection>
long CollectionCount(Collection* collection) {
    long count = 0;
    collection->get_Count(&count);
    return count;
}
HRESULT GetReceiverAt(IReceiversColl* receivers, long index, ComPtr<IReceiver>& receiver);
HRESULT GetFileAt(IFilesColl* files, long index, ComPtr<IReceiverFile>& file);
// The receiver key ("serial!model!port text") of a receiver that a folder of this brand lists;
// false for one it does not list: another brand, or a label missing or empty.
bool ReadListedReceiverKey(IReceiver* receiver, DWORD brand, std::wstring* key);
struct ReceiverFileInfo {
    std::wstring name;
    long size = 0;
    DATE time = 0;
};
// Name, time and size; a value that cannot be read stays empty or 0.
ReceiverFileInfo ReadFileInfo(IReceiverFile* file);

// The one home of the receiver files' extension: the namespace shows it (brand 1 always, of
// brand 2 the HVL3 family only), the device knows its files without it.
bool FilesShowExtension(DWORD brand, const std::wstring& receiverKey);
std::wstring FileDisplayName(const std::wstring& deviceName, bool withExtension);
std::wstring FileDeviceName(const std::wstring& displayName);

// get_ItemByName with a device name; the result as it stands, even S_OK without a file.
HRESULT GetFileByName(IFilesColl* files, const std::wstring& deviceName, ComPtr<IDispatch>& file);
HRESULT QueryReceiverFile(IUnknown* object, ComPtr<IReceiverFile>& file);
// A file had from a files collection, with the objects that led to it. The caller decides how
// long they live: the view keeps them until its list is refilled, as events from the device
// arrive while a proxy is released.
struct FoundReceiverFile {
    ComPtr<IFilesColl> files;
    ComPtr<IDispatch> object;
    ComPtr<IReceiverFile> file;
};
// The file that the namespace shows as displayName, asked of the collection by its device name.
HRESULT FindShownFile(IUnknown* filesCollection, const std::wstring& displayName, FoundReceiverFile& found);
// Download into the stream, handed over as one VARIANT of VT_UNKNOWN.
HRESULT StartDownload(IReceiverFile* file, IStream* stream);
