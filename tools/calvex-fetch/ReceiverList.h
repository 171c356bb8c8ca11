#pragma once
// The receivers that the brand folders list, as the user sees them in Explorer, and the one
// device manager call the tools make themselves: whether it can be reached at all.
#include <windows.h>
#include <shlobj.h>

#include <string>
#include <vector>

#include "FetchOptions.h"
#include "LayoutPattern.h"
#include "ShellNamespace.h"
#include "com/ComPtr.h"
#include "com/ServerGone.h"

extern const wchar_t* const kBrandNames[2];

struct Receiver {
    std::wstring brand;
    std::wstring display;  // model "@" port, as Explorer shows it
    std::wstring key;      // the parsing name: serial "!" model "!" port
    ComPtr<IShellFolder> parent;
    OwnedItem item;
    // "Calvex Q7/RTK@COM3 (5211-40125!Q7#RTK!COM3)"
    std::wstring Title() const { return brand + L" " + display + L" (" + key + L")"; }
    // Display name, brand, and serial and model as the key holds them ("Q7#RTK" is "Q7/RTK").
    LayoutReceiver Fields() const;
};

// The receivers of one brand folder (0 Calvex, 1 Brennor), in listing order.
std::vector<Receiver> BrandReceivers(IShellFolder* brandFolder, int brand, HRESULT* result = nullptr);
// The receivers of every brand the options ask for; fails when a brand folder does not bind.
HRESULT ListReceivers(const FetchOptions& options, std::vector<Receiver>& receivers);
// By key or display name, ignoring case.
bool Matches(const Receiver& receiver, const std::wstring& wanted);
// True when the options name no receiver or name this one.
bool IsWanted(const FetchOptions& options, const Receiver& receiver);

// The device manager, started if need be; its IDispatch for the liveness question below.
HRESULT ConnectDeviceManager(ComPtr<IDispatch>& manager);
// Asks the device manager for its receivers: a real round trip to its process.
HRESULT AskDeviceManager(IDispatch* manager);
// "0x8007001F"
std::wstring HexText(HRESULT hr);
// Why nothing can be done without a device manager: what the batch and the watch both say.
std::wstring NoDeviceManagerText(HRESULT hr);
