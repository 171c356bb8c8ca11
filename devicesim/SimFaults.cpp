#include "SimFaults.h"

#include "IniText.h"

namespace {

const wchar_t* const kKnownCalls[] = {
    L"IDeviceMgr.get_Receivers", L"IDeviceMgr.Refresh",
    L"IReceiversColl.get__NewEnum", L"IReceiversColl.get_Item", L"IReceiversColl.get_Count",
    L"IReceiversColl.get_ItemBySerialNumber", L"IReceiversColl.get_ItemByKey",
    L"IReceiver.get_Files", L"IReceiver.get_Connected", L"IReceiver.get_FirmwareVersion",
    L"IReceiver.get_PortName", L"IReceiver.get_PortType", L"IReceiver.get_SerialNumber",
    L"IReceiver.get_Model", L"IReceiver.get_Brand", L"IReceiver.get_BatteryLevel",
    L"IReceiver.get_FreeMemory", L"IReceiver.get_Label",
    L"IFilesColl.get__NewEnum", L"IFilesColl.get_Item", L"IFilesColl.get_Count", L"IFilesColl.get_ItemByName",
    L"IReceiverFile.get_Name", L"IReceiverFile.get_Receiver", L"IReceiverFile.get_Size",
    L"IReceiverFile.get_Time", L"IReceiverFile.Delete", L"IReceiverFile.Download",
    L"IReceiverFile.get_Downloading", L"IReceiverFile.Cancel",
};

const wchar_t* CanonicalCall(const std::wstring& call) {
    for (const wchar_t* known : kKnownCalls)
        if (SameTextNoCase(call, known)) return known;
    return nullptr;
}

std::wstring Key(const std::wstring& call, const std::wstring& target) {
    return target.empty() ? call : call + L":" + target;
}

template <class Setting>
long Pick(const Setting& mine, const Setting& global, long fallback) {
    return mine.set ? mine.value : global.set ? global.value : fallback;
}

}  // namespace

bool SimFaults::SetCallFailure(const std::wstring& name, HRESULT result, std::wstring* error) {
    return AddCall(m_calls, name, result, error);
}

bool SimFaults::SetExitCall(const std::wstring& name, std::wstring* error) {
    return AddCall(m_exits, name, S_OK, error);
}

bool SimFaults::ExitsOn(const wchar_t* call, const std::wstring& target) const {
    HRESULT unused = S_OK;
    return Find(m_exits, call, target, &unused);
}

bool SimFaults::AddCall(CallMap& calls, const std::wstring& name, HRESULT result, std::wstring* error) {
    size_t colon = name.find(L':');
    const wchar_t* call = CanonicalCall(name.substr(0, colon));
    if (!call) {
        *error = L"unknown call \"" + name + L"\"";
        return false;
    }
    std::wstring target = colon == std::wstring::npos ? std::wstring() : name.substr(colon + 1);
    // Targets compare without regard to case, as file names do.
    calls[Key(call, target)] = result;
    return true;
}

bool SimFaults::SetTransfer(const std::wstring& key, long value, std::wstring* error) {
    struct Named {
        const wchar_t* name;
        Setting* setting;
        long low, high;
    } settings[] = {
        {L"Rate", &m_rate, 0, 0x7FFFFFFF},
        {L"FailAtPercent", &m_failAtPercent, 0, 100},
        {L"FailResult", &m_failResult, -0x7FFFFFFF - 1, 0x7FFFFFFF},
        {L"ExitAtPercent", &m_exitAtPercent, 0, 100},
        {L"GrowAtPercent", &m_growAtPercent, 0, 100},
        {L"RetimeAtPercent", &m_retimeAtPercent, 0, 100},
    };
    for (const Named& named : settings) {
        if (!SameTextNoCase(key, named.name)) continue;
        if (value < named.low || value > named.high) {
            *error = key + L" out of range";
            return false;
        }
        named.setting->set = true;
        named.setting->value = value;
        return true;
    }
    *error = L"unknown transfer key \"" + key + L"\"";
    return false;
}

bool SimFaults::FindCall(const wchar_t* call, const std::wstring& target, HRESULT* result) const {
    return Find(m_calls, call, target, result);
}

bool SimFaults::Find(const CallMap& calls, const wchar_t* call, const std::wstring& target, HRESULT* result) {
    if (calls.empty()) return false;
    if (!target.empty()) {
        for (const auto& entry : calls) {
            if (SameTextNoCase(entry.first, Key(call, target))) {
                *result = entry.second;
                return true;
            }
        }
    }
    auto found = calls.find(call);
    if (found == calls.end()) return false;
    *result = found->second;
    return true;
}

SimTransferPlan SimFaults::Plan(const SimFaults& receiver, const SimFaults& global) {
    SimTransferPlan plan;
    plan.rate = static_cast<DWORD>(Pick(receiver.m_rate, global.m_rate, 0));
    plan.failAtPercent = Pick(receiver.m_failAtPercent, global.m_failAtPercent, -1);
    plan.failResult = static_cast<HRESULT>(Pick(receiver.m_failResult, global.m_failResult, E_FAIL));
    plan.exitAtPercent = Pick(receiver.m_exitAtPercent, global.m_exitAtPercent, -1);
    plan.growAtPercent = Pick(receiver.m_growAtPercent, global.m_growAtPercent, -1);
    plan.retimeAtPercent = Pick(receiver.m_retimeAtPercent, global.m_retimeAtPercent, -1);
    return plan;
}
