#include "support/RegistrationExpectations.h"

#include <gtest/gtest.h>

#include <cstring>
#include <cwchar>

#include "com/Handles.h"
#include "support/TestSupport.h"

namespace testsupport {
namespace {
const std::wstring kCalvex = L"{E102076F-4057-4e7f-8209-511258F12B62}";
const std::wstring kBrennor = L"{E65CDE76-B4FC-447f-A9DD-A011176B14E7}";
const wchar_t kNameSpace[] = L"Software\\Microsoft\\Windows\\CurrentVersion\\Explorer\\MyComputer\\NameSpace\\";
const wchar_t kApproved[] = L"Software\\Microsoft\\Windows\\CurrentVersion\\Shell Extensions\\Approved";
}  // namespace

bool RegistryKeyExists(HKEY root, const std::wstring& path) {
    UniqueRegKey key;
    return RegOpenKeyExW(root, path.c_str(), 0, KEY_READ, key.Put()) == ERROR_SUCCESS;
}

std::wstring RegistryText(HKEY root, const std::wstring& path, const wchar_t* name) {
    wchar_t text[512] = L"";
    DWORD size = sizeof text, type = 0, value = 0;
    if (RegGetValueW(root, path.c_str(), name, RRF_RT_REG_SZ | RRF_RT_REG_DWORD, &type, text, &size)) return L"<none>";
    memcpy(&value, text, sizeof value);  // the buffer holds the DWORD's bytes: no aliasing cast
    if (type == REG_DWORD) swprintf(text, 512, L"0x%08X", value);
    return text;
}

void ExpectModuleRegistered(const std::wstring& dll) {
    struct Folder { std::wstring clsid, name, icon, tip; } folders[] = {
        {kCalvex, L"Calvex GNSS Receivers", L",0", L"Allows you to read files from QPR receivers"},
        {kBrennor, L"Brennor GNSS Receivers", L",1", L"Allows you to read files from Brennor receivers"},
    };
    for (const Folder& f : folders) {
        SCOPED_TRACE(Narrow(f.name));
        const std::wstring key = L"CLSID\\" + f.clsid;
        EXPECT_EQ(f.name, RegistryText(HKEY_CLASSES_ROOT, key));
        EXPECT_EQ(dll + f.icon, RegistryText(HKEY_CLASSES_ROOT, key + L"\\DefaultIcon"));
        EXPECT_EQ(dll, RegistryText(HKEY_CLASSES_ROOT, key + L"\\InprocServer32"));
        EXPECT_EQ(L"Apartment", RegistryText(HKEY_CLASSES_ROOT, key + L"\\InprocServer32", L"ThreadingModel"));
        EXPECT_EQ(L"{274B0214-A88B-43fd-AE0A-CD342C4C748F}", RegistryText(HKEY_CLASSES_ROOT, key + L"\\TypeLib"));
        EXPECT_EQ(f.tip, RegistryText(HKEY_CLASSES_ROOT, key, L"InfoTip"));
        EXPECT_EQ(L"0xA0000000", RegistryText(HKEY_CLASSES_ROOT, key + L"\\ShellFolder", L"Attributes"));
        EXPECT_EQ(f.name, RegistryText(HKEY_LOCAL_MACHINE, kNameSpace + f.clsid));
        EXPECT_EQ(f.name, RegistryText(HKEY_LOCAL_MACHINE, kApproved, f.clsid.c_str()));
    }
    struct ProgId { const wchar_t* name; const wchar_t* clsid; } progIds[] = {
        {L"CalvexReceiversContextMenu", L"{02A29F80-115B-4927-9BB7-9BC337FA1DCB}"},
        {L"CalvexReceiversDataObject", L"{28DFF262-EF28-4c02-AB1F-B1C5B390AC9E}"},
        {L"CalvexReceiversEnumIDList", L"{966A0F58-9413-4f82-B100-2F5135BBF95E}"},
        {L"CalvexReceiversExtractIcon", L"{0B87B281-FD00-4071-A536-96AAACBA14BF}"},
        {L"CalvexReceiversQueryInfo", L"{5E8389A1-F90A-400c-8BB6-B82A0053CF7D}"},
        {L"CalvexReceiversShellView", L"{7041F778-98A3-40aa-BA28-7AD0B4F35D98}"},
    };
    for (const ProgId& p : progIds) {
        const std::wstring independent = std::wstring(L"CalvexReceiversShellExt.") + p.name;
        SCOPED_TRACE(Narrow(independent));
        EXPECT_EQ(std::wstring(p.name) + L" Class", RegistryText(HKEY_CLASSES_ROOT, independent));
        EXPECT_EQ(independent + L".1", RegistryText(HKEY_CLASSES_ROOT, independent + L"\\CurVer"));
        EXPECT_EQ(p.clsid, RegistryText(HKEY_CLASSES_ROOT, independent + L".1\\CLSID"));
        EXPECT_EQ(independent + L".1", RegistryText(HKEY_CLASSES_ROOT, std::wstring(L"CLSID\\") + p.clsid + L"\\ProgID"));
        EXPECT_EQ(dll, RegistryText(HKEY_CLASSES_ROOT, std::wstring(L"CLSID\\") + p.clsid + L"\\InprocServer32"));
    }
    EXPECT_TRUE(RegistryKeyExists(HKEY_CLASSES_ROOT, L"TypeLib\\{274B0214-A88B-43FD-AE0A-CD342C4C748F}\\1.0"));
}

void ExpectModuleUnregistered() {
    for (const std::wstring& clsid : {kCalvex, kBrennor}) {
        EXPECT_FALSE(RegistryKeyExists(HKEY_CLASSES_ROOT, L"CLSID\\" + clsid));
        EXPECT_FALSE(RegistryKeyExists(HKEY_LOCAL_MACHINE, kNameSpace + clsid));
        EXPECT_EQ(L"<none>", RegistryText(HKEY_LOCAL_MACHINE, kApproved, clsid.c_str()));
    }
    EXPECT_TRUE(RegistryKeyExists(HKEY_LOCAL_MACHINE, kNameSpace)) << "NoRemove keys stay";
    EXPECT_FALSE(RegistryKeyExists(HKEY_CLASSES_ROOT, L"CalvexReceiversShellExt.CalvexReceiversShellView"));
    EXPECT_FALSE(RegistryKeyExists(HKEY_CLASSES_ROOT, L"TypeLib\\{274B0214-A88B-43FD-AE0A-CD342C4C748F}"));
}

}  // namespace testsupport
