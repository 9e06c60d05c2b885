// Readers of the small productions of the schema grammar, and printers that undo them (RFC 4512, section 4.1).
//
// A reader consumes tokens and returns what it read; a failure is an exception of the token layer whose text says what
// was expected (ldcf_token.h).
#pragma once

#include "servers/vrnd/libdirbase/schema/ldcf_common.h"
#include "servers/vrnd/libdirbase/schema/ldcf_token.h"

namespace ldcf_stream {

// An object id: a name, bare or quoted, a dotted id or a number.
DIRBASE_EXPORT csgl_string oid(ldcf_token_factory& factory);

// One object id, or any number of them between parentheses, joined by "$".
DIRBASE_EXPORT ldcf_names oids(ldcf_token_factory& factory);

// A numeric object id, bare or alone between quotes.
DIRBASE_EXPORT csgl_string qnoid(ldcf_token_factory& factory);

// A number, or 0 and nothing consumed.
DIRBASE_EXPORT int optlen(ldcf_token_factory& factory);

// A quoted text; one, or a list of at least one between parentheses.
DIRBASE_EXPORT csgl_string qdstring(ldcf_token_factory& factory);
DIRBASE_EXPORT csgl_vector<csgl_string> qdstrings(ldcf_token_factory& factory);

// A bare name, and a quoted name.
DIRBASE_EXPORT csgl_string descr(ldcf_token_factory& factory);
DIRBASE_EXPORT csgl_string qdescr(ldcf_token_factory& factory);

// One quoted name, or a list of at least one between parentheses; the first one goes to `primary`. Names that differ
// only in case count once.
DIRBASE_EXPORT ldcf_names qdescrs(ldcf_token_factory& factory, csgl_string& primary);

// The number that a token of digits stands for; one too large for an int is the largest int.
DIRBASE_EXPORT int number(const ldcf_token& token);

// "KEYWORD a " or "KEYWORD ( a $ b ) ", and nothing for an empty set.
DIRBASE_EXPORT csgl_string oids(const csgl_string& keyword, const ldcf_names& names);

// "KEYWORD 'a' " or "KEYWORD ( 'a' 'b' ) " with the primary name first, and nothing for an empty set.
DIRBASE_EXPORT csgl_string qdescrs(const csgl_string& keyword, const ldcf_names& names, const csgl_string& primary);

}  // namespace ldcf_stream
