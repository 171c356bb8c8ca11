#pragma once
#include <windows.h>

// The module's class identifiers (and the module type library), defined in ClassIds.cpp.
extern const CLSID CLSID_CalvexReceiversShellFolder;   // {E102076F-4057-4e7f-8209-511258F12B62}
extern const CLSID CLSID_CalvexReceiversShellView;     // {7041F778-98A3-40aa-BA28-7AD0B4F35D98}
extern const CLSID CLSID_CalvexReceiversEnumIDList;    // {966A0F58-9413-4f82-B100-2F5135BBF95E}
extern const CLSID CLSID_CalvexReceiversExtractIcon;   // {0B87B281-FD00-4071-A536-96AAACBA14BF}
extern const CLSID CLSID_CalvexReceiversContextMenu;   // {02A29F80-115B-4927-9BB7-9BC337FA1DCB}
extern const CLSID CLSID_CalvexReceiversDataObject;    // {28DFF262-EF28-4c02-AB1F-B1C5B390AC9E}
extern const CLSID CLSID_CalvexReceiversQueryInfo;     // {5E8389A1-F90A-400c-8BB6-B82A0053CF7D}
extern const CLSID CLSID_BrennorReceiversShellFolder;  // {E65CDE76-B4FC-447f-A9DD-A011176B14E7}
extern const GUID LIBID_CalvexReceiversShellExtLib;    // {274B0214-A88B-43FD-AE0A-CD342C4C748F}
