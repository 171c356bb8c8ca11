#pragma once
// The device manager's type library, from which every object of the simulator answers
// IDispatch (so script clients can drive it) and against which COM marshals the interfaces.
#include <windows.h>
#include <oaidl.h>

#include <string>

class SimTypeLibrary {
public:
    // The server loads the library from its own file (it embeds it); objects made in a test
    // process load the registered one.
    static void UseFile(const std::wstring& path);
    static HRESULT Load(ITypeLib** library);

    // IDispatch over a dual interface: type information and the calls through it.
    static HRESULT GetTypeInfo(REFIID iid, UINT index, ITypeInfo** info);
    static HRESULT GetIDsOfNames(REFIID iid, LPOLESTR* names, UINT count, DISPID* ids);
    static HRESULT Invoke(REFIID iid, void* object, DISPID id, WORD flags, DISPPARAMS* params, VARIANT* result,
                          EXCEPINFO* exception, UINT* argumentError);

private:
    // The interface (vtable) part of a dual interface's type information.
    static HRESULT InterfaceInfo(REFIID iid, ITypeInfo** info);
};
