// Names of attributes: their forms, their order, and the syntaxes behind them.
//
// Names compare without regard to ASCII case. What looks a name up in the active schema says so; its caller holds the
// read side of the schema lock (ldcf_api_get_modify_attr_info_lock_g). Everything else may be called from any thread.
// Without memory for the look-up (ldcf_api_attr_get_info) a name counts as one that the schema doesn't know, except
// where another result is told.
#pragma once

#include <stdbool.h>
#include <stdint.h>

#include "libraries/dirbase_export.h"
#include "libraries/libavl/avl.h"
#include "servers/vrnd/libdirbase/schema/asyntaxinfo.h"

// An attribute by its schema record, or where the schema doesn't know it (null) by its name.
typedef struct attr_type_key attr_type_key;
struct attr_type_key {
    asyntaxinfo* info;
    const char* name;
};

DIRBASE_C_BEGIN

// ---- texts, changed in place; the result is the text ----------------------------------------------------------------

// A to Z to lower case, and blanks removed from both ends (string_strip_leading, string_strip_trailing).
DIRBASE_EXPORT char* attr_normalize(char* name);

// Removes "oid." from the start, in any case.
DIRBASE_EXPORT char* removeOIDstr(char* name);

// a to z to upper case; null stays null.
DIRBASE_EXPORT char* uppercase(char* text);

// ---- tests ----------------------------------------------------------------------------------------------------------

// Whether a name of `length` bytes is well-formed: a letter and then letters, digits, "-" and ";"; or, with "oid." in
// front or not, numbers with single points between them (RFC 4512 section 1.4, and tags behind the name).
DIRBASE_EXPORT bool is_attr_name_valid(const char* name, int length);

// True for a null or empty text and for one of ASCII letters and digits only.
DIRBASE_EXPORT bool is_string_alphanum(const char* text);

// Whether a name is among those that a client asks for: true when the list is null, holds the name, or holds "*".
DIRBASE_EXPORT bool attr_selected(const char* name, char** list);

// Whether the first name is the attribute of the second, or a version of it: false when only the first has a ";",
// and when both have one and the tags differ. Looks both up; two names that the schema doesn't know count as one
// attribute. False without memory.
DIRBASE_EXPORT bool is_subtype_attr(const char* a, const char* b);

// Checks a mapping: two names joined by "$", the first of them in the schema, which is looked up, the second
// well-formed. Blanks beside the "$" and "oid." in front of either name don't count.
//
//   second, first  unless null take the names in new texts for the caller to free(), on success only
//
// Returns LDAP_SUCCESS; LDAP_CONSTRAINT_VIOLATION for a null or empty text, or with message 168, 170 or 171 for another
// bad one; LDAP_NO_MEMORY.
DIRBASE_EXPORT int verifyAttributeMapping(const char* mapping, char** second, char** first);

// ---- order ----------------------------------------------------------------------------------------------------------

// 0 for one record; 1 when one of them is null; else the order of their first names, or of the names given when both
// are null.
DIRBASE_EXPORT int compare_asyntaxinfo(const asyntaxinfo* a, const asyntaxinfo* b, const char* name_a,
                                       const char* name_b);
DIRBASE_EXPORT int attr_type_cmp(const attr_type_key* a, const attr_type_key* b);

// The order of a name and a record's first name; and 0 when the name is one of the record's, else 1.
DIRBASE_EXPORT int attr_syntax_name_cmp(const char* name, const asyntaxinfo* info);
DIRBASE_EXPORT int attr_syntax_names_cmp(const char* name, const asyntaxinfo* info);

// ---- syntaxes, looked up --------------------------------------------------------------------------------------------

// The syntax code of an attribute; SC_CIS when the schema doesn't know it.
DIRBASE_EXPORT uint32_t attr_syntax(const char* name);

// The same for a filter: 0 for a name that it can't use, which is one that the schema doesn't know, or that has a
// language tag while these are switched off (get_g_language_tags_enabled). `info`, unless null, takes the record, null
// with 0.
DIRBASE_EXPORT uint32_t attr_syntax_for_filter(const char* name);
DIRBASE_EXPORT uint32_t attr_syntax_for_filter_return_asi(const char* name, asyntaxinfo** info);

// A tree of records for whoever wants one; the library puts nothing into it.
DIRBASE_EXPORT extern avl_node* attr_syntaxes;
DIRBASE_EXPORT avl_node* attr_syntaxes_get(void);

// Whether names go to clients in lower case, 1 or 0: the environment variable XANLDAP_ATTRLOWERCASE, asked for once,
// turns that off by "FALSE" or "NO" in any case.
DIRBASE_EXPORT int convertAttrLowerCase(void);

DIRBASE_C_END
