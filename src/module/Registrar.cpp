#include "module/Registrar.h"

#include <shlwapi.h>

#include <memory>
#include <vector>

#include "com/Handles.h"

namespace {
const HRESULT kSyntaxError = HRESULT_FROM_WIN32(ERROR_INVALID_DATA);

enum class Flag { None, NoRemove, ForceRemove, Delete };

struct Value {
    bool present = false;
    wchar_t type = 0;  // 's' or 'd'
    std::wstring text;
};

struct Node {
    Flag flag = Flag::None;
    bool isValue = false;  // "val name = ..."
    std::wstring name;
    Value value;
    std::vector<Node> children;
};

class Tokenizer {
public:
    explicit Tokenizer(const std::wstring& text) : m_text(text) {}

    // Next token; quoted tokens come back unquoted with quoted = true. Empty at the end.
    bool Next(std::wstring& token, bool& quoted) {
        while (m_pos < m_text.size() && iswspace(m_text[m_pos])) ++m_pos;
        token.clear();
        quoted = false;
        if (m_pos >= m_text.size()) return false;
        wchar_t c = m_text[m_pos];
        // A brace stands alone; "{E102076F-...}" is a key name.
        bool alone = m_pos + 1 >= m_text.size() || iswspace(m_text[m_pos + 1]);
        if (((c == L'{' || c == L'}') && alone) || c == L'=') {
            token = c;
            ++m_pos;
            return true;
        }
        if (c == L'\'') return ReadQuoted(token, quoted);
        while (m_pos < m_text.size() && !iswspace(m_text[m_pos]) && m_text[m_pos] != L'=')
            token += m_text[m_pos++];
        return true;
    }

private:
    bool ReadQuoted(std::wstring& token, bool& quoted) {
        quoted = true;
        ++m_pos;
        while (m_pos < m_text.size()) {
            wchar_t c = m_text[m_pos++];
            if (c == L'\'') {
                if (m_pos < m_text.size() && m_text[m_pos] == L'\'') {
                    token += L'\'';
                    ++m_pos;
                    continue;
                }
                return true;
            }
            token += c;
        }
        return false;  // unterminated
    }

    const std::wstring& m_text;
    size_t m_pos = 0;
};

class Parser {
public:
    explicit Parser(const std::wstring& text) : m_tokens(text) { Advance(); }

    HRESULT ParseRoots(std::vector<Node>& roots) {
        while (!m_token.empty() || m_quoted) {
            Node root;
            root.name = m_token;
            Advance();
            if (!Expect(L"{")) return kSyntaxError;
            HRESULT hr = ParseKeys(root.children);
            if (FAILED(hr)) return hr;
            roots.push_back(std::move(root));
        }
        return m_ok ? S_OK : kSyntaxError;
    }

private:
    void Advance() { m_ok = m_tokens.Next(m_token, m_quoted) || m_token.empty(); }
    bool Is(const wchar_t* word) const { return !m_quoted && _wcsicmp(m_token.c_str(), word) == 0; }
    bool Expect(const wchar_t* word) {
        if (!Is(word)) return false;
        Advance();
        return true;
    }

    // Keys up to and including the closing brace.
    HRESULT ParseKeys(std::vector<Node>& keys) {
        while (!Is(L"}")) {
            if (m_token.empty() && !m_quoted) return kSyntaxError;
            Node node;
            HRESULT hr = ParseKey(node);
            if (FAILED(hr)) return hr;
            keys.push_back(std::move(node));
        }
        Advance();
        return S_OK;
    }

    HRESULT ParseKey(Node& node) {
        if (Is(L"NoRemove")) node.flag = Flag::NoRemove;
        else if (Is(L"ForceRemove")) node.flag = Flag::ForceRemove;
        else if (Is(L"Delete")) node.flag = Flag::Delete;
        if (node.flag != Flag::None) Advance();
        if (Is(L"val")) {
            node.isValue = true;
            Advance();
        }
        if (m_token.empty() && !m_quoted) return kSyntaxError;
        node.name = m_token;
        Advance();
        if (Is(L"=")) {
            Advance();
            HRESULT hr = ParseValue(node.value);
            if (FAILED(hr)) return hr;
        } else if (node.isValue) {
            return kSyntaxError;
        }
        if (!node.isValue && Is(L"{")) {
            Advance();
            return ParseKeys(node.children);
        }
        return S_OK;
    }

    HRESULT ParseValue(Value& value) {
        if (!Is(L"s") && !Is(L"d")) return kSyntaxError;
        value.type = static_cast<wchar_t>(towlower(m_token[0]));
        Advance();
        if (m_token.empty() && !m_quoted) return kSyntaxError;
        value.text = m_token;
        value.present = true;
        Advance();
        return S_OK;
    }

    Tokenizer m_tokens;
    std::wstring m_token;
    bool m_quoted = false;
    bool m_ok = true;
};

HKEY RootKey(const std::wstring& name) {
    struct { const wchar_t* shortName; const wchar_t* longName; HKEY key; } roots[] = {
        {L"HKCR", L"HKEY_CLASSES_ROOT", HKEY_CLASSES_ROOT},
        {L"HKCU", L"HKEY_CURRENT_USER", HKEY_CURRENT_USER},
        {L"HKLM", L"HKEY_LOCAL_MACHINE", HKEY_LOCAL_MACHINE},
        {L"HKU", L"HKEY_USERS", HKEY_USERS},
    };
    for (const auto& root : roots)
        if (_wcsicmp(name.c_str(), root.shortName) == 0 || _wcsicmp(name.c_str(), root.longName) == 0)
            return root.key;
    return nullptr;
}

HRESULT FromWin32(LSTATUS status) { return status == ERROR_SUCCESS ? S_OK : HRESULT_FROM_WIN32(status); }

HRESULT SetValue(HKEY key, const wchar_t* name, const Value& value) {
    if (value.type == L'd') {
        DWORD number = wcstoul(value.text.c_str(), nullptr, 0);
        return FromWin32(RegSetValueExW(key, name, 0, REG_DWORD, reinterpret_cast<const BYTE*>(&number), sizeof number));
    }
    return FromWin32(RegSetValueExW(key, name, 0, REG_SZ, reinterpret_cast<const BYTE*>(value.text.c_str()),
                                    static_cast<DWORD>((value.text.size() + 1) * sizeof(wchar_t))));
}

HRESULT DeleteTree(HKEY parent, const std::wstring& name) {
    LSTATUS status = SHDeleteKeyW(parent, name.c_str());
    return status == ERROR_FILE_NOT_FOUND ? S_OK : FromWin32(status);
}

HRESULT RegisterKeys(HKEY parent, const std::vector<Node>& keys);
HRESULT UnregisterKeys(HKEY parent, const std::vector<Node>& keys);

HRESULT RegisterKey(HKEY parent, const Node& node) {
    if (node.isValue) return node.flag == Flag::Delete ? S_OK : SetValue(parent, node.name.c_str(), node.value);
    if (node.flag == Flag::Delete) return DeleteTree(parent, node.name);
    if (node.flag == Flag::ForceRemove) {
        HRESULT hr = DeleteTree(parent, node.name);
        if (FAILED(hr)) return hr;
    }
    UniqueRegKey key;
    HRESULT hr = FromWin32(RegCreateKeyExW(parent, node.name.c_str(), 0, nullptr, REG_OPTION_NON_VOLATILE,
                                           KEY_READ | KEY_WRITE, nullptr, key.Put(), nullptr));
    if (FAILED(hr)) return hr;
    if (node.value.present) {
        hr = SetValue(key.Get(), nullptr, node.value);
        if (FAILED(hr)) return hr;
    }
    return RegisterKeys(key.Get(), node.children);
}

HRESULT UnregisterKey(HKEY parent, const Node& node) {
    if (node.isValue) {
        if (node.flag == Flag::NoRemove) return S_OK;
        LSTATUS status = RegDeleteValueW(parent, node.name.c_str());
        return status == ERROR_FILE_NOT_FOUND ? S_OK : FromWin32(status);
    }
    if (node.flag == Flag::ForceRemove || node.flag == Flag::Delete) return DeleteTree(parent, node.name);
    {
        UniqueRegKey key;
        LSTATUS status = RegOpenKeyExW(parent, node.name.c_str(), 0, KEY_READ | KEY_WRITE, key.Put());
        if (status == ERROR_FILE_NOT_FOUND) return S_OK;  // nothing of ours there
        if (status != ERROR_SUCCESS) return FromWin32(status);
        HRESULT hr = UnregisterKeys(key.Get(), node.children);
        if (FAILED(hr) || node.flag == Flag::NoRemove) return hr;
        DWORD subkeys = 0;
        if (RegQueryInfoKeyW(key.Get(), nullptr, nullptr, nullptr, &subkeys, nullptr, nullptr, nullptr,
                             nullptr, nullptr, nullptr, nullptr) != ERROR_SUCCESS || subkeys > 0)
            return S_OK;  // someone else's keys live below: leave it
    }
    LSTATUS status = RegDeleteKeyW(parent, node.name.c_str());
    return status == ERROR_FILE_NOT_FOUND ? S_OK : FromWin32(status);
}

HRESULT RegisterKeys(HKEY parent, const std::vector<Node>& keys) {
    for (const Node& node : keys) {
        HRESULT hr = RegisterKey(parent, node);
        if (FAILED(hr)) return hr;
    }
    return S_OK;
}

HRESULT UnregisterKeys(HKEY parent, const std::vector<Node>& keys) {
    for (const Node& node : keys) {
        HRESULT hr = UnregisterKey(parent, node);
        if (FAILED(hr)) return hr;
    }
    return S_OK;
}

std::wstring Substitute(const std::wstring& script, const std::wstring& modulePath) {
    std::wstring out;
    for (size_t i = 0; i < script.size(); ++i) {
        if (script[i] != L'%') {
            out += script[i];
        } else if (script.compare(i, 8, L"%MODULE%") == 0) {
            for (wchar_t c : modulePath) out.append(c == L'\'' ? 2 : 1, c);  // the path stands inside '...'
            i += 7;
        } else if (script.compare(i, 2, L"%%") == 0) {
            out += L'%';
            ++i;
        } else {
            out += L'%';
        }
    }
    return out;
}
}  // namespace

HRESULT Registrar::RunScript(const std::wstring& script, bool registering) const {
    std::vector<Node> roots;
    HRESULT hr = Parser(Substitute(script, m_modulePath)).ParseRoots(roots);
    if (FAILED(hr)) return hr;
    for (const Node& root : roots) {
        HKEY key = RootKey(root.name);
        if (!key) return kSyntaxError;
        hr = registering ? RegisterKeys(key, root.children) : UnregisterKeys(key, root.children);
        if (FAILED(hr)) return hr;
    }
    return S_OK;
}

HRESULT Registrar::RunResource(HINSTANCE module, UINT id, bool registering) const {
    HRSRC found = FindResourceW(module, MAKEINTRESOURCEW(id), L"REGISTRY");
    HGLOBAL loaded = found ? LoadResource(module, found) : nullptr;
    const char* bytes = loaded ? static_cast<const char*>(LockResource(loaded)) : nullptr;
    if (!bytes) return HRESULT_FROM_WIN32(ERROR_RESOURCE_DATA_NOT_FOUND);
    int size = static_cast<int>(SizeofResource(module, found));
    std::wstring script(static_cast<size_t>(size), L'\0');
    int length = MultiByteToWideChar(CP_ACP, 0, bytes, size, &script[0], size);
    script.resize(static_cast<size_t>(length > 0 ? length : 0));
    return RunScript(script, registering);
}
