// The older normaliser, which cleans the text of a DN in place, and the small routines around it.
//
// It serves the plug-in interface and texts that may not be DNs at all: it never refuses one. Blanks go, ";" between
// RDNs becomes ",", needless backslashes disappear ("a\2Cb" becomes "a2Cb"); quotes stay. The key of a DN is made
// elsewhere: dn_esc.h.
//
// Texts are zero-terminated UTF-8 of any length, changed in place; the result never grows. All may be called from any
// thread on texts that no other thread touches meanwhile. None is null, but for those of dn_normalize,
// dn_normalize_case, dn_normalize_light, dn_upcase, dn_compare, dn_attr_get_short_name and ShortRDNType. What looks
// types up in the active schema says so; its caller holds the read side of the schema lock.
#pragma once

#include "libraries/dirbase_export.h"

// A pair; the pairs of an RDN; the RDNs of a DN. Each record owns what it points to, texts of malloc among it.
typedef struct rdn_type rdn_type;
struct rdn_type {
    char* type;
    char* value;
};
typedef struct rdn_list rdn_list;
struct rdn_list {
    rdn_type* rdn;
    rdn_list* next;
};
typedef struct dn_list dn_list;
struct dn_list {
    rdn_list* rdns;
    dn_list* next;
};

DIRBASE_C_BEGIN

// ---- normalising in place -------------------------------------------------------------------------------------------

// Cleans a DN, puts the pairs of multi-valued RDNs in order (dn_normalize_compound_RDN, which uses the schema), and
// shortens a type "xan-kerberosname" in front to "xan-kn". Returns the text, also a null one.
DIRBASE_EXPORT char* dn_normalize(char* dn);

// The same, then utfToUpper.
DIRBASE_EXPORT char* dn_normalize_case(char* dn);

// Only cleans the DN, then utfToUpper when `upper` isn't 0.
DIRBASE_EXPORT char* dn_normalize_light(char* dn, int upper);

// Rewrites a clean DN: in RDNs with several pairs every type becomes the attribute's shortest name, and the pairs are
// sorted by that, then by value, by vrn_strcasecmp. An attribute that the schema doesn't know, a pair without "=", or
// memory running out leaves the text as it was. Returns the text.
DIRBASE_EXPORT char* dn_normalize_compound_RDN(char* dn);

// utfToUpper; returns the text.
DIRBASE_EXPORT char* dn_upcase(char* text);

// The order by strcmp of two DNs after dn_normalize_case (which uses the schema), both left as they are; -1 for a null
// text and without memory for copies. An RDN whose pairs there is no memory to put in order is compared as it is
// written, so equal DNs may count as different then.
DIRBASE_EXPORT int dn_compare(const char* a, const char* b);

// Remove spaces, line feeds and carriage returns from the start, or from the end. A blank that a backslash escapes
// stays. Return the text.
DIRBASE_EXPORT char* string_strip_leading(char* text);
DIRBASE_EXPORT char* string_strip_trailing(char* text);

// ---- types and values
// ------------------------------------------------------------------------------------------------

// The shortest among the names and the OID of an attribute, the earliest of equally short ones; it belongs to the
// schema. Null when the active schema doesn't know it, and without memory for its record.
//
//   temporary  set to 1 when the attribute's record has to be dropped after use (ldcf_api_attrtype_reset_info); records
//              here live with their definitions, so it is always 0. May be null.
DIRBASE_EXPORT const char* dn_attr_get_short_name(const char* name, int* temporary);

// The same; an attribute that the schema doesn't know is told to the message log.
DIRBASE_EXPORT const char* ShortRDNType(const char* name);

// The bare value of an RDN's element: quotes and escapes resolved, "#" with plain hexadecimal pairs. It ends in front
// of whatever can't be resolved. Returns a new text for the caller to free(), or null without memory.
DIRBASE_EXPORT char* minAttrValue(const char* value);

// The value of a hexadecimal digit; senseless for other characters.
DIRBASE_EXPORT int hexval(char c);

// Find the type at *start, and the value behind the "=" at *start, as find_end_attr_type33 and find_end_attr_value33
// do, with the same errors. But the end of the text ends a type and an empty value, and a backslash only goes with
// pairs of digits and with " + , ; < = > \.
DIRBASE_EXPORT const char* find_end_attr_type(const char** start, const char** last, int* error);
DIRBASE_EXPORT const char* find_end_attr_value(const char** start, const char** last, int* error);

// ---- records
// ----------------------------------------------------------------------------------------------------------

// New empty records; null without memory.
DIRBASE_EXPORT rdn_type* rdn_type_new(void);
DIRBASE_EXPORT rdn_list* rdn_list_new(void);
DIRBASE_EXPORT dn_list* dn_list_new(void);

// A new record of "type=value", cut at the first "="; null when there is none and without memory.
DIRBASE_EXPORT rdn_type* rdn_type_init(const char* text);

// Release a record and all linked behind it; null does nothing.
DIRBASE_EXPORT void rdn_type_delete(rdn_type* rdn);
DIRBASE_EXPORT void rdn_list_delete(rdn_list* list);
DIRBASE_EXPORT void dn_list_delete(dn_list* list);

DIRBASE_C_END
