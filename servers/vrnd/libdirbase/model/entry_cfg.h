// Entries from the server's configuration.
#pragma once

#include "libraries/dirbase_export.h"
#include "libraries/libcfg/cfg.h"
#include "servers/vrnd/libdirbase/model/entry.h"

DIRBASE_C_BEGIN

// Makes an entry from one that a configuration search has found, with a value tree and each value once. e_norm_dn stays
// null.
//
//   cfg      the session of the search
//   message  an entry of a search, or its result for the first one; only read
//
// What the client fails to give, and what attr_merge refuses, is told to the debug log and left out. Returns the entry
// for the caller to release with entry_free, or null when memory ran out or an argument is null. The caller holds the
// read side of the schema lock.
DIRBASE_EXPORT Entry* CFGMessage2Entry(cfg_handle* cfg, cfg_message* message);

DIRBASE_C_END
