#include "ReceiverList.h"

#include <cwchar>

namespace {
// The device manager's class, asked for only to say whether it can be reached.
const CLSID kDeviceManagerClass = {0x0FADF314, 0xB4FD, 0x413C, {0x9E, 0x26, 0x6B, 0xC4, 0x9B, 0x06, 0x60, 0x80}};
constexpr DISPID kReceiversProperty = 1;
}  // namespace

const wchar_t* const kBrandNames[2] = {L"Calvex", L"Brennor"};

LayoutReceiver Receiver::Fields() const {
    const size_t first = key.find(L'!'), last = key.rfind(L'!');
    LayoutReceiver fields{display, key.substr(0, first), L"", brand};
    if (first != std::wstring::npos && last > first) fields.model = key.substr(first + 1, last - first - 1);
    for (wchar_t& c : fields.model) if (c == L'#') c = L'/';
    return fields;
}

std::vector<Receiver> BrandReceivers(IShellFolder* brandFolder, int brand, HRESULT* result) {
    std::vector<Receiver> receivers;
    for (OwnedItem& item : ShellChildren(brandFolder, SHCONTF_FOLDERS, result)) {
        Receiver receiver{kBrandNames[brand], ShellName(brandFolder, item.get(), SHGDN_NORMAL),
                          ShellName(brandFolder, item.get(), SHGDN_INFOLDER | SHGDN_FORPARSING),
                          ComPtr<IShellFolder>(brandFolder), std::move(item)};
        receivers.push_back(std::move(receiver));
    }
    return receivers;
}

HRESULT ListReceivers(const FetchOptions& options, std::vector<Receiver>& receivers) {
    const bool wanted[2] = {options.calvex, options.brennor};
    for (int brand = 0; brand < 2; ++brand) {
        if (!wanted[brand]) continue;
        ComPtr<IShellFolder> folder;
        const HRESULT hr = BindShellPath(kBrandFolderPaths[brand], folder);
        if (FAILED(hr)) return hr;
        for (Receiver& receiver : BrandReceivers(folder.Get(), brand)) receivers.push_back(std::move(receiver));
    }
    return S_OK;
}

bool Matches(const Receiver& receiver, const std::wstring& wanted) {
    return lstrcmpiW(receiver.key.c_str(), wanted.c_str()) == 0 || lstrcmpiW(receiver.display.c_str(), wanted.c_str()) == 0;
}

bool IsWanted(const FetchOptions& options, const Receiver& receiver) {
    if (options.receivers.empty()) return true;
    for (const std::wstring& wanted : options.receivers)
        if (Matches(receiver, wanted)) return true;
    return false;
}

HRESULT ConnectDeviceManager(ComPtr<IDispatch>& manager) {
    return CoCreateInstance(kDeviceManagerClass, nullptr, CLSCTX_LOCAL_SERVER, IID_IDispatch, manager.PutVoid());
}

HRESULT AskDeviceManager(IDispatch* manager) {
    DISPPARAMS none = {};
    VARIANT result;
    VariantInit(&result);
    const HRESULT hr = manager->Invoke(kReceiversProperty, IID_NULL, LOCALE_USER_DEFAULT, DISPATCH_PROPERTYGET, &none,
                                       &result, nullptr, nullptr);
    VariantClear(&result);
    return hr;
}

std::wstring HexText(HRESULT hr) {
    wchar_t text[16];
    swprintf(text, 16, L"0x%08X", static_cast<unsigned>(hr));
    return text;
}

std::wstring NoDeviceManagerText(HRESULT hr) {
    return L"no device manager: it cannot be started (" + HexText(hr) + L")";
}
