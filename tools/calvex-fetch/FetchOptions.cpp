#include "FetchOptions.h"

const wchar_t kFetchUsage[] =
    L"usage: calvex-fetch [--brand calvex|brennor|all] [--receiver KEY-or-display-name]... [--all | --new] "
    L"[--move] [--layout PATTERN] [--dry-run] [--log FILE] TARGET\n"
    L"       calvex-fetch --watch [--brand calvex|brennor|all] [--receiver KEY-or-display-name]... [--move] "
    L"[--layout PATTERN] [--no-notify] [--log FILE] TARGET\n";

namespace {
bool Fail(std::wstring& error, const std::wstring& reason) {
    error = reason;
    return false;
}

bool SetBrand(const std::wstring& brand, FetchOptions& options) {
    if (brand != L"calvex" && brand != L"brennor" && brand != L"all") return false;
    options.calvex = brand != L"brennor";
    options.brennor = brand != L"calvex";
    return true;
}
}  // namespace

bool FetchOptionTakesValue(const std::wstring& argument) {
    return argument == L"--brand" || argument == L"--receiver" || argument == L"--log" || argument == L"--layout";
}

bool ParseFetchOptions(const std::vector<std::wstring>& arguments, FetchOptions& options, std::wstring& error) {
    options = FetchOptions();
    bool newOnly = false;
    for (size_t i = 0; i < arguments.size(); ++i) {
        const std::wstring& argument = arguments[i];
        const bool hasValue = i + 1 < arguments.size();
        if (FetchOptionTakesValue(argument)) {
            if (!hasValue) return Fail(error, argument + L" needs a value");
            const std::wstring& value = arguments[++i];
            if (argument == L"--receiver") options.receivers.push_back(value);
            else if (argument == L"--log") options.log = value;
            else if (argument == L"--layout") options.layout = value;
            else if (!SetBrand(value, options)) return Fail(error, L"unknown brand \"" + value + L"\"");
        } else if (argument == L"--all") {
            options.all = true;
        } else if (argument == L"--new") {
            newOnly = true;
        } else if (argument == L"--dry-run") {
            options.dryRun = true;
        } else if (argument == L"--watch") {
            options.watch = true;
        } else if (argument == L"--move") {
            options.move = true;
        } else if (argument == L"--no-notify") {
            options.notify = false;
        } else if (argument.size() > 1 && argument[0] == L'-') {
            return Fail(error, L"unknown option " + argument);
        } else if (!options.target.empty()) {
            return Fail(error, L"more than one TARGET");
        } else {
            options.target = argument;
            // "D:\Survey\" on a command line arrives as D:\Survey" (the backslash escapes the quote).
            if (options.target.size() > 1 && options.target.back() == L'"') options.target.pop_back();
        }
    }
    if (options.all && newOnly) return Fail(error, L"--all and --new exclude each other");
    // A watch fetches only what is new, for real: anything else would fetch forever or nothing.
    if (options.watch && (options.all || options.dryRun))
        return Fail(error, std::wstring(L"--watch and ") + (options.all ? L"--all" : L"--dry-run") + L" exclude each other");
    if (options.target.empty()) return Fail(error, L"no TARGET folder given");
    return true;
}
