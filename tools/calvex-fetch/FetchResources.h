// Resource identifiers of calvex-fetch and calvex-fetchw.
#pragma once

// The first icon is the programs' own in Explorer, and the watch's in the notification area.
#define IDI_FETCH 1
