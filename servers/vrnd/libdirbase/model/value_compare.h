// The order of two values by their syntax, and the nodes of value trees that hold values ready to be compared.
//
// A syntax is told by its whole code (base/syntax_codes.h). Texts compare as strcmp does, byte for byte up to the first
// zero byte.
#pragma once

#include <stdint.h>

#include "libraries/dirbase_export.h"
#include "libraries/libber/berval.h"

// A value in normal form. Record, berval and content are one block, with a zero byte behind the content.
typedef struct AttrvalsNorm AttrvalsNorm;
struct AttrvalsNorm {
    uint32_t syntax;      // code of the content
    int32_t owns_buffer;  // not 0: the content is a block of its own, released with the node
    berval* value;        // always &stored
    berval stored;  // of text the normal form; of a binary value its length and no bytes; of integers and booleans
                    // an int32_t, of times a tag_timestamp_struct (timestamp.h)
};

DIRBASE_C_BEGIN

// Compares two values.
//
//   raw  which sides have to be normalised first, on a copy: bit 0 the first, bit 1 the second. Matters to texts with
//        SC_CIS only. A side that can't be normalised is taken as it is.
//
// Text, integers (what no number begins counts as 0), times: negative, 0 or positive. Booleans: their texts, without
// regard to ASCII case. Binary values: the first byte that differs, then the lengths. Failures are positive as well, so
// only 0 can be trusted to be more than "not equal": LDAP_OTHER for a null value, LDAP_NO_MEMORY, what str2timestamp
// has for a bad time, and LDAP_INVALID_SYNTAX for another code.
//
// Any thread may call it; for DNs that have to be normalised it holds the read side of the schema lock.
DIRBASE_EXPORT int value_cmp(const berval* a, const berval* b, uint32_t syntax, int raw);

// The order of a value tree, in the form of an avl_cmp. Both are AttrvalsNorm of one syntax; the code of the first
// tells how they compare. Binary values compare by length alone. LDAP_INVALID_SYNTAX for another code. Nothing is
// allocated.
DIRBASE_EXPORT int value_cmp_fast(const void* a, const void* b, int unused DIRBASE_DEFAULT(0));

DIRBASE_C_END
