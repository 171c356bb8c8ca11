#pragma once
// The simulated device manager (class DeviceMgr, IDeviceMgr) over a folder tree of receivers.
#include <windows.h>

#include <memory>

#include "CalvexDeviceMgrLib.h"
#include "SimDispatch.h"
#include "SimModel.h"
#include "com/ComObject.h"

// The device manager for the receivers under rootFolder, made in this process: tests drive
// the very objects that the server hands out. Events and downloads run from this thread's
// messages, so the caller's thread must pump them.
HRESULT CreateSimDeviceManager(const wchar_t* rootFolder, REFIID riid, void** ppv);

class SimDeviceManager : public ComObjectRoot, public SimDispatch<IDeviceMgr, &IID_IDeviceMgr> {
public:
    explicit SimDeviceManager(std::shared_ptr<SimModel> model);

    BEGIN_INTERFACE_TABLE(SimDeviceManager)
        INTERFACE_ENTRY(IDeviceMgr)
        INTERFACE_ENTRY_IID(IID_IDispatch, IDeviceMgr)
    END_INTERFACE_TABLE()

    // IDeviceMgr
    STDMETHODIMP get_Receivers(IDispatch** receivers) override;
    STDMETHODIMP Refresh() override;

private:
    std::shared_ptr<SimModel> m_model;
    ComPtr<IDispatch> m_receivers;  // one collection per device manager object
};
