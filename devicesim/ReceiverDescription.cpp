#include "ReceiverDescription.h"

#include <cstdio>

namespace {

std::wstring EntryError(const IniText::Entry& entry, const wchar_t* what) {
    return L"line " + std::to_wstring(entry.line) + L": " + entry.key + L" " + what;
}

}  // namespace

bool ReceiverDescription::Parse(const IniText& ini, std::wstring* error) {
    using Parser = bool (ReceiverDescription::*)(const IniText::Section&, std::wstring*);
    struct Known {
        const wchar_t* name;
        Parser parse;
    } known[] = {
        {L"Receiver", &ReceiverDescription::ParseReceiver},
        {L"Transfer", &ReceiverDescription::ParseTransfer},
        {L"Fail", &ReceiverDescription::ParseFail},
        {L"Times", &ReceiverDescription::ParseTimes},
        {L"Exit", &ReceiverDescription::ParseExit},
        {L"Report", &ReceiverDescription::ParseReport},
    };
    if (!ini.Find(L"Receiver")) {
        *error = L"no [Receiver] section";
        return false;
    }
    for (const IniText::Section& section : ini.Sections()) {
        const Known* match = nullptr;
        for (const Known& k : known)
            if (SameTextNoCase(section.name, k.name)) match = &k;
        if (!match) {
            *error = L"unknown section [" + section.name + L"]";
            return false;
        }
        if (!(this->*match->parse)(section, error)) return false;
    }
    return true;
}

bool ReceiverDescription::ParseReceiver(const IniText::Section& section, std::wstring* error) {
    struct Field {
        const wchar_t* key;
        std::wstring* text;  // one of text / number
        long* number;
        bool required;
        bool seen;
    } fields[] = {
        {L"Brand", nullptr, &brand, true, false},
        {L"Label", &label, nullptr, false, false},
        {L"SerialNumber", &serialNumber, nullptr, true, false},
        {L"Model", &model, nullptr, true, false},
        {L"PortType", nullptr, &portType, true, false},
        {L"PortName", &portName, nullptr, false, false},
        {L"Firmware", &firmwareVersion, nullptr, false, false},
        {L"Battery", nullptr, &batteryLevel, false, false},
        {L"FreeMemory", nullptr, &freeMemory, false, false},
    };
    for (const IniText::Entry& entry : section.entries) {
        Field* field = nullptr;
        for (Field& f : fields)
            if (SameTextNoCase(entry.key, f.key)) field = &f;
        if (!field) {
            *error = EntryError(entry, L"is not a receiver key");
            return false;
        }
        if (field->text) {
            *field->text = entry.value;
        } else if (!ParseInteger32(entry.value, field->number)) {
            *error = EntryError(entry, L"is not a number");
            return false;
        }
        field->seen = true;
    }
    for (const Field& f : fields) {
        if (f.required && !f.seen) {
            *error = std::wstring(L"[Receiver] has no ") + f.key;
            return false;
        }
    }
    return true;
}

bool ReceiverDescription::ParseTransfer(const IniText::Section& section, std::wstring* error) {
    return ParseNumbers(section, L"is not a number", error, [this](const IniText::Entry& entry, long value,
                                                                   std::wstring* reason) {
        return faults.SetTransfer(entry.key, value, reason);
    });
}

bool ReceiverDescription::ParseFail(const IniText::Section& section, std::wstring* error) {
    return ParseNumbers(section, L"is not a result code", error, [this](const IniText::Entry& entry, long value,
                                                                       std::wstring* reason) {
        return faults.SetCallFailure(entry.key, static_cast<HRESULT>(value), reason);
    });
}

bool ReceiverDescription::ParseExit(const IniText::Section& section, std::wstring* error) {
    return ParseNumbers(section, L"is not a number", error, [this](const IniText::Entry& entry, long value,
                                                                   std::wstring* reason) {
        return value == 0 || faults.SetExitCall(entry.key, reason);
    });
}

bool ReceiverDescription::ParseReport(const IniText::Section& section, std::wstring* error) {
    for (const IniText::Entry& entry : section.entries) {
        const wchar_t* end = nullptr;
        bool read = false;
        if (SameTextNoCase(entry.key, L"Time")) {
            // Any double, NaN and infinities included: a time that is no date is the point.
            wchar_t* stop = nullptr;
            report.time = wcstod(entry.value.c_str(), &stop);
            end = stop;
            read = report.timeSet = stop != entry.value.c_str();
        } else if (SameTextNoCase(entry.key, L"Size")) {
            read = report.sizeSet = ParseInteger32(entry.value, &report.size);
        } else if (SameTextNoCase(entry.key, L"Found")) {
            read = report.foundAsNothing = SameTextNoCase(entry.value, L"nothing");
        } else if (SameTextNoCase(entry.key, L"NameLength")) {
            read = ParseInteger32(entry.value, &report.nameLength) && report.nameLength >= 0 &&
                   report.nameLength <= 4096;
        } else {
            *error = EntryError(entry, L"is not a report key");
            return false;
        }
        if (!read || (end && *end)) {
            *error = EntryError(entry, L"does not read");
            return false;
        }
    }
    return true;
}

void ReceiverDescription::ApplyReport(std::wstring* name, long* size, DATE* time) const {
    if (report.sizeSet) *size = report.size;
    if (report.timeSet) *time = report.time;
    if (name->size() < static_cast<size_t>(report.nameLength)) name->resize(report.nameLength, L'_');
}

bool ReceiverDescription::ParseNumbers(const IniText::Section& section, const wchar_t* notANumber,
                                       std::wstring* error, const NumberSetter& set) {
    for (const IniText::Entry& entry : section.entries) {
        long value = 0;
        if (!ParseInteger32(entry.value, &value)) {
            *error = EntryError(entry, notANumber);
            return false;
        }
        std::wstring reason;
        if (!set(entry, value, &reason)) {
            *error = L"line " + std::to_wstring(entry.line) + L": " + reason;
            return false;
        }
    }
    return true;
}

bool ReceiverDescription::ParseTimes(const IniText::Section& section, std::wstring* error) {
    for (const IniText::Entry& entry : section.entries) {
        DATE time = 0;
        if (!ParseLocalTime(entry.value, &time)) {
            *error = EntryError(entry, L"is not a time (YYYY-MM-DD HH:MM:SS)");
            return false;
        }
        times.emplace_back(entry.key, time);
    }
    return true;
}

bool ReceiverDescription::FindTime(const std::wstring& fileName, DATE* time) const {
    for (const auto& entry : times) {
        if (SameTextNoCase(entry.first, fileName)) {
            *time = entry.second;
            return true;
        }
    }
    return false;
}

bool ReceiverDescription::ParseLocalTime(const std::wstring& text, DATE* time) {
    unsigned year = 0, month = 0, day = 0, hour = 0, minute = 0, second = 0;
    int used = 0;
    if (swscanf(text.c_str(), L"%4u-%2u-%2u %2u:%2u:%2u%n", &year, &month, &day, &hour, &minute, &second,
                &used) != 6 ||
        static_cast<size_t>(used) != text.size())
        return false;
    if (year < 1900 || month < 1 || month > 12 || day < 1 || day > 31 || hour > 23 || minute > 59 || second > 59)
        return false;
    SYSTEMTIME st = {static_cast<WORD>(year), static_cast<WORD>(month), 0, static_cast<WORD>(day),
                     static_cast<WORD>(hour), static_cast<WORD>(minute), static_cast<WORD>(second), 0};
    FILETIME check;  // rejects 2026-02-31 and the like, which VariantTime would roll over
    if (!SystemTimeToFileTime(&st, &check)) return false;
    return SystemTimeToVariantTime(&st, time) != FALSE;
}
