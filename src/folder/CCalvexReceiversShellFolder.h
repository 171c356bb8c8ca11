#pragma once
// The "Calvex GNSS Receivers" folder under the computer node, and its receiver sub-folders.
#include "folder/CReceiversBrandFolder.h"

class CCalvexReceiversShellFolder : public CReceiversBrandFolder<CCalvexReceiversShellFolder, BrandCalvex> {};
