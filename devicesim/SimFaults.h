#pragma once
// Misbehaviour asked of the simulated device manager, per receiver (its description file) or
// for every receiver (the registry): failing calls, the transfer rate, a download that fails
// or kills the whole server at some percent.
#include <windows.h>

#include <map>
#include <string>

// What a download of one receiver does, after receiver and global settings are merged.
struct SimTransferPlan {
    DWORD rate = 0;               // bytes per second; 0: as fast as the timer allows
    long failAtPercent = -1;      // -1: never
    HRESULT failResult = E_FAIL;
    long exitAtPercent = -1;      // -1: never
    long growAtPercent = -1;      // the tree's file grows by a byte here, as one still logged; -1: never
    long retimeAtPercent = -1;    // the tree's file is a minute newer here, as one rewritten; -1: never
};

class SimFaults {
public:
    // Call names are "Interface.method" as the contract spells them, "IReceiver.get_Label";
    // a file-level call may name one file after a colon: "IFilesColl.get_Item:LOG0002".
    bool SetCallFailure(const std::wstring& name, HRESULT result, std::wstring* error);
    // The server ends itself (as ExitAtPercent does) when this call is made; named as above.
    bool SetExitCall(const std::wstring& name, std::wstring* error);
    bool ExitsOn(const wchar_t* call, const std::wstring& target) const;
    // One key of the transfer settings (Rate, FailAtPercent, FailResult, ExitAtPercent,
    // GrowAtPercent, RetimeAtPercent).
    bool SetTransfer(const std::wstring& key, long value, std::wstring* error);

    // The failure set for call on target (a file name, or empty), the targeted entry first.
    bool FindCall(const wchar_t* call, const std::wstring& target, HRESULT* result) const;
    // Receiver settings win over the global ones, key by key.
    static SimTransferPlan Plan(const SimFaults& receiver, const SimFaults& global);

private:
    struct Setting {
        bool set = false;
        long value = 0;
    };
    using CallMap = std::map<std::wstring, HRESULT>;  // keys canonical: the known name, then ":target"
    static bool AddCall(CallMap& calls, const std::wstring& name, HRESULT result, std::wstring* error);
    static bool Find(const CallMap& calls, const wchar_t* call, const std::wstring& target, HRESULT* result);
    CallMap m_calls;
    CallMap m_exits;
    Setting m_rate, m_failAtPercent, m_failResult, m_exitAtPercent, m_growAtPercent, m_retimeAtPercent;
};
