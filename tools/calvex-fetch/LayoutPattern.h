#pragma once
// Where --layout puts each file below the target: folders made of text and of fields of the
// receiver and of the file's own time, "{receiver}\{yyyy}\{doy}". Parsed once, before anything
// is touched; expanded for every file.
#include <windows.h>

#include <string>
#include <vector>

#include "DescriptorName.h"

// What a layout may name of a receiver, as the namespace lists it.
struct LayoutReceiver {
    std::wstring display;  // "Q7/RTK@COM3"
    std::wstring serial;   // "5211-40125"
    std::wstring model;    // "Q7/RTK"
    std::wstring brand;    // "Calvex" or "Brennor"
};

class LayoutPattern {
public:
    // False with the bad part named: "unknown field {doy2}", "\"..\" would leave the target".
    bool Parse(const std::wstring& pattern, std::wstring& error);
    // Some field is a date: a receiver's files then go to more than one folder.
    bool IsDated() const;
    // The folder, relative to a target of targetLength characters, of a file that the receiver
    // logged at `logged` (its own clock as it reports it: no zone applies). Receiver fields are
    // made safe as a folder name ("Q7/RTK" gives "Q7_RTK"); refused when they make no name.
    SafeName Folder(const LayoutReceiver& receiver, const SYSTEMTIME& logged, size_t targetLength) const;
    // Folder for any date: every date gives the same length, so this says whether the
    // receiver's fields make a name below the target.
    SafeName Check(const LayoutReceiver& receiver, size_t targetLength) const;
    // The same with the date fields as written, "Q7_RTK@COM3\{yyyy}\{doy}", for the receiver's line.
    std::wstring Shown(const LayoutReceiver& receiver) const;

private:
    enum class Field { Text, Receiver, Serial, Model, Brand, Year, Year2, Month, Day, DayOfYear };
    struct Piece {
        Field field;
        std::wstring text;  // the literal text, or the field as written: "{yyyy}"
    };
    using Component = std::vector<Piece>;

    // Every component's values joined by "\"; date fields as written without logged.
    bool Expand(const LayoutReceiver& receiver, const SYSTEMTIME* logged, std::wstring& joined, SafeName& refusal) const;
    static bool ParseComponent(const std::wstring& text, Component& component, std::wstring& error);
    // A field's value; false when a receiver field makes no name (reason in refusal).
    static bool Value(const Piece& piece, const LayoutReceiver& receiver, const SYSTEMTIME* logged,
                      std::wstring& value, SafeName& refusal);

    std::vector<Component> m_components;
};
