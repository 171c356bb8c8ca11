#pragma once
// The forms of the COM kit for objects that do not count their own references: a part that
// lives and dies with its owner, and an object that outlives every reference to it. Like
// every form of the kit, they answer QueryInterface from the class's interface table.
#include "com/ComObject.h"

// The form for a part of another object that lives and dies with it (a connection point in
// its container): Class answers its own table, and every reference is the owner's.
template <class Class, class... Interfaces>
class OwnedPart : public Interfaces... {
public:
    OwnedPart(const OwnedPart&) = delete;
    OwnedPart& operator=(const OwnedPart&) = delete;

    STDMETHODIMP QueryInterface(REFIID riid, void** ppv) override {
        return TableQueryInterface(static_cast<Class*>(this), Class::InterfaceTable(), riid, ppv);
    }
    STDMETHODIMP_(ULONG) AddRef() override { return m_owner->AddRef(); }
    STDMETHODIMP_(ULONG) Release() override { return m_owner->Release(); }

protected:
    explicit OwnedPart(IUnknown* owner) : m_owner(owner) {}
    ~OwnedPart() = default;

private:
    IUnknown* m_owner;  // not counted: we live inside it
};

// The form for an object that outlives every reference to it (a server's class object, made
// on its stack): references are not counted, and a count of one never reads as the last.
template <class Class, class... Interfaces>
class Uncounted : public Interfaces... {
public:
    STDMETHODIMP QueryInterface(REFIID riid, void** ppv) override {
        return TableQueryInterface(static_cast<Class*>(this), Class::InterfaceTable(), riid, ppv);
    }
    STDMETHODIMP_(ULONG) AddRef() override { return 2; }
    STDMETHODIMP_(ULONG) Release() override { return 1; }

protected:
    Uncounted() = default;
    ~Uncounted() = default;
};
