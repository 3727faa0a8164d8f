// Shared folders and their recycle bins.
//
// Errors: results are negative on failure, with the reason in the calling thread's last error.
// Threads: any; other processes may use the same registry.
#pragma once

#include "platform/qlibc.h"

// Appends the names of the shares of the kinds selected by `kinds` (a set of bits, one per kind;
// 0x30f selects every kind that can have a recycle bin), in ascending order of their bytes. Returns
// the number of names appended.
int ORVAShareEnum(QLIBC_SZLIST* list, int kinds);

// Switches the recycle bin of a share on (1) or off (0), durably. Switching on creates the bin's
// folder; switching off leaves its contents. Fails for an unknown share.
int ORVARecycleStatusSet(const char* share, int enabled);
