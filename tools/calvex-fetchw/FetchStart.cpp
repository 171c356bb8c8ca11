#include "FetchStart.h"

#include <algorithm>

#include "ReceiverList.h"
#include "SettingsDialog.h"

namespace {
bool NamesTarget(const std::vector<std::wstring>& arguments) {
    for (size_t i = 0; i < arguments.size(); ++i) {
        if (FetchOptionTakesValue(arguments[i])) ++i;
        else if (arguments[i].empty() || arguments[i][0] != L'-') return true;
    }
    return false;
}
}  // namespace

FetchStart TakeFetchStart(std::vector<std::wstring>& arguments) {
    if (arguments.empty()) return FetchStart::Plain;
    for (const wchar_t* flag : {L"--logon", L"--settings"}) {
        const auto found = std::find(arguments.begin(), arguments.end(), flag);
        if (found == arguments.end()) continue;
        arguments.erase(found);
        return flag[2] == L'l' ? FetchStart::Logon : FetchStart::Settings;
    }
    return FetchStart::CommandLine;
}

bool OptionsOverSettings(const FetchSettings& stored, const std::vector<std::wstring>& arguments, FetchOptions& options,
                         std::wstring& error) {
    std::vector<std::wstring> merged{L"--watch"};
    if (stored.move) merged.push_back(L"--move");
    if (!stored.notify) merged.push_back(L"--no-notify");
    // A later --layout replaces an earlier one; a second TARGET would be refused.
    merged.push_back(L"--layout");
    merged.push_back(stored.layout);
    merged.insert(merged.end(), arguments.begin(), arguments.end());
    if (!NamesTarget(arguments)) merged.push_back(stored.target);
    return ParseFetchOptions(merged, options, error);
}

int RunSettingsAlone() {
    FetchSettings settings = LoadFetchSettings(nullptr);
    std::vector<Receiver> receivers;
    ListReceivers(FetchOptions(), receivers);
    std::vector<LayoutReceiver> connected;
    for (const Receiver& receiver : receivers) connected.push_back(receiver.Fields());
    return ShowSettingsDialog(nullptr, settings, connected) ? 0 : 1;
}
