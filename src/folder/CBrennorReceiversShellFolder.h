#pragma once
// The "Brennor GNSS Receivers" folder under the computer node, and its receiver sub-folders.
#include "folder/CReceiversBrandFolder.h"

class CBrennorReceiversShellFolder : public CReceiversBrandFolder<CBrennorReceiversShellFolder, BrandBrennor> {};
