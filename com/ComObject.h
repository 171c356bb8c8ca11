#pragma once
// The COM object model of the module: a class derives from ComObjectRoot and its interfaces,
// lists them once with the INTERFACE_TABLE macros, and is instantiated as ComObject<T>
// (plain) or ComAggObject<T> (aggregated under an outer unknown). Support objects that hold
// no module lock derive from RefCounted<Class, Interfaces...> instead. IUnknown is written
// here and nowhere else.
#include <windows.h>
#include <unknwn.h>
#include <new>
#include <utility>
#include "com/ModuleLock.h"

struct InterfaceEntry {
    const IID* iid;
    ptrdiff_t offset;  // from the object's start to that interface's vtable pointer
};

template <class Class, class Interface>
ptrdiff_t InterfaceOffset() {
    // Any non-null address works: only the difference made by the base-class cast counts.
    Class* base = reinterpret_cast<Class*>(0x1000);
    return reinterpret_cast<char*>(static_cast<Interface*>(base)) - reinterpret_cast<char*>(base);
}

// Looks riid up in a table ended by a null iid. IUnknown is answered by the first entry.
HRESULT TableQueryInterface(void* object, const InterfaceEntry* table, REFIID riid, void** ppv);

#define BEGIN_INTERFACE_TABLE(Class)                                  \
public:                                                               \
    static const InterfaceEntry* InterfaceTable() {                   \
        using TableClass = Class;                                     \
        static const InterfaceEntry table[] = {
#define INTERFACE_ENTRY(Interface) {&IID_##Interface, InterfaceOffset<TableClass, Interface>()},
#define INTERFACE_ENTRY_IID(iid, Interface) {&(iid), InterfaceOffset<TableClass, Interface>()},
#define END_INTERFACE_TABLE() \
            {nullptr, 0}      \
        };                    \
        return table;         \
    }

// Base of every COM class of the module. Holds the module lock for the object's lifetime
// and the reference count; the final classes below implement IUnknown over it.
class ComObjectRoot {
public:
    ComObjectRoot() = default;
    ComObjectRoot(const ComObjectRoot&) = delete;
    ComObjectRoot& operator=(const ComObjectRoot&) = delete;
    virtual ~ComObjectRoot() = default;

    // Second-phase construction; a failure destroys the new object.
    HRESULT FinalConstruct() { return S_OK; }
    // Runs once, on the last Release, before the destructor.
    void FinalRelease() {}

protected:
    ModuleLockHolder m_moduleLock;
    volatile LONG m_refCount = 0;
};

// The plain, self-counting form of T.
template <class T>
class ComObject final : public T {
public:
    template <class... Args>
    explicit ComObject(Args&&... args) : T(std::forward<Args>(args)...) {}

    STDMETHODIMP QueryInterface(REFIID riid, void** ppv) override {
        return TableQueryInterface(this, T::InterfaceTable(), riid, ppv);
    }
    STDMETHODIMP_(ULONG) AddRef() override { return InterlockedIncrement(&this->m_refCount); }
    STDMETHODIMP_(ULONG) Release() override {
        ULONG count = InterlockedDecrement(&this->m_refCount);
        if (count == 0) {
            this->m_refCount = 1;  // keeps FinalRelease's own AddRef/Release pairs harmless
            this->FinalRelease();
            delete this;
        }
        return count;
    }

    // New object with no reference yet (the caller's QueryInterface takes the first).
    template <class... Args>
    static ComObject* CreateUncounted(Args&&... args) {
        ComObject* object = new (std::nothrow) ComObject(std::forward<Args>(args)...);
        if (object && FAILED(object->RunFinalConstruct())) {
            delete object;
            return nullptr;
        }
        return object;
    }

private:
    HRESULT RunFinalConstruct() {
        InterlockedIncrement(&this->m_refCount);  // a QI/Release pair in FinalConstruct must not free us
        HRESULT hr = T::FinalConstruct();
        InterlockedDecrement(&this->m_refCount);
        return hr;
    }
};

// T living inside an outer object: its IUnknown delegates to the outer unknown.
template <class T>
class ComContainedObject final : public T {
public:
    template <class... Args>
    explicit ComContainedObject(IUnknown* outer, Args&&... args)
        : T(std::forward<Args>(args)...), m_outer(outer) {}

    STDMETHODIMP QueryInterface(REFIID riid, void** ppv) override { return m_outer->QueryInterface(riid, ppv); }
    STDMETHODIMP_(ULONG) AddRef() override { return m_outer->AddRef(); }
    STDMETHODIMP_(ULONG) Release() override { return m_outer->Release(); }

    HRESULT InnerQueryInterface(REFIID riid, void** ppv) {
        return TableQueryInterface(this, T::InterfaceTable(), riid, ppv);
    }
    HRESULT InnerFinalConstruct() { return T::FinalConstruct(); }
    void InnerFinalRelease() { T::FinalRelease(); }

private:
    IUnknown* m_outer;  // not counted: the outer object owns us
};

// The aggregatable form: this object is the non-delegating unknown handed to the outer.
template <class T>
class ComAggObject final : public IUnknown {
public:
    template <class... Args>
    explicit ComAggObject(IUnknown* outer, Args&&... args)
        : m_contained(outer, std::forward<Args>(args)...) {}

    STDMETHODIMP QueryInterface(REFIID riid, void** ppv) override {
        if (!ppv) return E_POINTER;
        if (IsEqualIID(riid, IID_IUnknown)) {
            *ppv = static_cast<IUnknown*>(this);
            AddRef();
            return S_OK;
        }
        return m_contained.InnerQueryInterface(riid, ppv);
    }
    STDMETHODIMP_(ULONG) AddRef() override { return InterlockedIncrement(&m_refCount); }
    STDMETHODIMP_(ULONG) Release() override {
        ULONG count = InterlockedDecrement(&m_refCount);
        if (count == 0) {
            m_refCount = 1;
            m_contained.InnerFinalRelease();
            delete this;
        }
        return count;
    }

    template <class... Args>
    static ComAggObject* CreateUncounted(IUnknown* outer, Args&&... args) {
        ComAggObject* object = new (std::nothrow) ComAggObject(outer, std::forward<Args>(args)...);
        if (object) {
            object->AddRef();
            HRESULT hr = object->m_contained.InnerFinalConstruct();
            InterlockedDecrement(&object->m_refCount);
            if (FAILED(hr)) {
                delete object;
                return nullptr;
            }
        }
        return object;
    }

private:
    ModuleLockHolder m_moduleLock;
    volatile LONG m_refCount = 0;
    ComContainedObject<T> m_contained;
};

// Creates T (aggregated when outer is given) and returns its riid. The class factory and the
// objects that make other objects of the module all come through here.
template <class T>
HRESULT CreateComInstance(IUnknown* outer, REFIID riid, void** ppv) {
    if (!ppv) return E_POINTER;
    *ppv = nullptr;
    IUnknown* unknown = nullptr;
    if (outer) {
        if (!IsEqualIID(riid, IID_IUnknown)) return CLASS_E_NOAGGREGATION;
        unknown = ComAggObject<T>::CreateUncounted(outer);
    } else {
        ComObject<T>* object = ComObject<T>::CreateUncounted();
        unknown = object ? reinterpret_cast<IUnknown*>(
                               reinterpret_cast<char*>(object) + T::InterfaceTable()[0].offset)
                         : nullptr;
    }
    if (!unknown) return E_OUTOFMEMORY;
    unknown->AddRef();
    HRESULT hr = unknown->QueryInterface(riid, ppv);
    unknown->Release();
    return hr;
}

// Creates a plain T and hands back the C++ object with one reference, for code inside the
// module that must call non-interface methods (Init, SetItem, ...) before handing it out.
template <class T, class... Args>
HRESULT CreateComObject(ComObject<T>** out, Args&&... args) {
    *out = ComObject<T>::CreateUncounted(std::forward<Args>(args)...);
    if (!*out) return E_OUTOFMEMORY;
    (*out)->AddRef();
    return S_OK;
}

// The plain reference-counted form, without the module lock: for support objects that take
// no lock of their own (an enumerator a data object hands out, an event sink its owner holds,
// a tool's drop target). Class derives from it, lists its interfaces in its table, and is
// made with new holding the references its creator asks for.
template <class Class, class... Interfaces>
class RefCounted : public Interfaces... {
public:
    RefCounted(const RefCounted&) = delete;
    RefCounted& operator=(const RefCounted&) = delete;

    STDMETHODIMP QueryInterface(REFIID riid, void** ppv) override {
        return TableQueryInterface(static_cast<Class*>(this), Class::InterfaceTable(), riid, ppv);
    }
    STDMETHODIMP_(ULONG) AddRef() override { return InterlockedIncrement(&m_refCount); }
    STDMETHODIMP_(ULONG) Release() override {
        const ULONG count = InterlockedDecrement(&m_refCount);
        if (count == 0) delete this;
        return count;
    }

protected:
    explicit RefCounted(LONG references = 0) : m_refCount(references) {}
    virtual ~RefCounted() = default;

private:
    volatile LONG m_refCount;
};
