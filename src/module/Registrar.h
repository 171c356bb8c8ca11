#pragma once
// Runs the module's registry scripts ("REGISTRY" resources) in the registrar syntax:
//   HKCR { NoRemove CLSID { ForceRemove {clsid} = s 'text' { val Name = s 'v' } } }
// Keywords: NoRemove (kept on removal), ForceRemove (replaced on registration, removed
// with its subtree on removal), Delete (removed on registration), val (a named value),
// s (REG_SZ), d (REG_DWORD). "%MODULE%" stands for the module's path, "%%" for "%".
#include <windows.h>
#include <string>

class Registrar {
public:
    explicit Registrar(std::wstring modulePath) : m_modulePath(std::move(modulePath)) {}

    HRESULT RunScript(const std::wstring& script, bool registering) const;
    HRESULT RunResource(HINSTANCE module, UINT id, bool registering) const;

private:
    std::wstring m_modulePath;
};
