#pragma once
// Makes one of the simulator's objects and hands it out through one of its interfaces, with
// the single reference that creation gives.
#include <utility>

#include "com/ComObject.h"

template <class T, class Interface, class... Args>
HRESULT CreateSimObject(Interface** out, Args&&... args) {
    *out = nullptr;
    ComObject<T>* object = nullptr;
    HRESULT hr = CreateComObject<T>(&object, std::forward<Args>(args)...);
    if (SUCCEEDED(hr)) *out = static_cast<typename T::Primary*>(object);
    return hr;
}
