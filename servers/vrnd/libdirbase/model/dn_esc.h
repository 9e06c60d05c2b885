// Structured DNs: one parse gives the chain of RDNs and both normal texts (RFC 4514 syntax, RFC 4517 section 4.2.15).
//
// The canonical text keeps the case of the values. In the upper text everything is in upper case that the schema
// compares without regard to case; it is the key by which the whole server knows a DN. In both
//
//   - the pairs of an RDN are sorted by type, then by value, by vrn_strcasecmp; equal ones stay in the order of
//     arrival;
//   - a type is the schema's first name of the attribute, whatever name or OID was written;
//   - a value is escaped in one way only: a backslash in front of each of " + , ; < = > \, of a "#" or space at its
//     beginning and of a space at its end; a line feed or tab at either end as a hexadecimal pair, since it would get
//     lost;
//   - "+" joins pairs and "," RDNs, without blanks.
//
// So the canonical text normalises to itself, unless escapes have made it longer than dn_longest or a first name holds
// other characters than letters, digits and hyphens. That is why a DN is refused that would end in an empty value,
// in the order of its pairs as written or as sorted ("cn=", "cn=,", a pair of quotes, "sn=a+cn=,"). A byte 0 written as
// a hexadecimal pair is refused because texts end there. In values that are folded to upper case, so is everything that
// utfToUpper refuses: bytes that aren't UTF-8, and characters above U+FFFF; and so are characters in more bytes than
// they take.
//
// The upper text is made of the canonical one, in whose order it stays. So where an RDN has one type twice, which
// X.501 forbids, the order of its pairs may depend on the case of letters outside ASCII, and pairs of a case-exact type
// that differ in case alone stay as they came: two spellings may have two upper texts then.
//
// A record is built whole by one call and only read afterwards, by one thread or many; it owns its chain and its texts.
// Nothing here raises an exception, and no argument may be null where that isn't said. Functions with a schema
// argument, and those that normalise, look types up in the active schema: their caller holds the read side of the
// schema lock (ldcf_api_get_modify_attr_info_lock_g). getParentDnUpper takes that itself.
//
// The environment variable VRND_V4_DN_PROCESSING, asked for once, turns on the older handling: "#" is then one of the
// characters that have to be escaped everywhere in a value.
#pragma once

#include <stddef.h>
#include <stdint.h>

#include "libraries/dirbase_export.h"

typedef struct asyntaxinfo asyntaxinfo;

// What may be wrong with a DN.
enum dn_error DIRBASE_ENUM_INT {
    DN_ERR_EMPTY_VALUE = -1,  // empty value at the end of the text
    DN_ERR_SYNTAX = 1,        // bad character in or behind a type, end of the text inside a type, malformed value
    DN_ERR_ESCAPE = 2,        // backslash followed by what can't be escaped
    DN_ERR_HEX_PAIR = 3,      // bad second digit of a hexadecimal pair
    DN_ERR_HEX_STRING = 4,    // bad digit in a "#" value
    DN_ERR_SPECIAL = 6,       // special character unescaped in a plain value
    DN_ERR_OID = 7,           // a digit expected in a numeric OID
    DN_ERR_STATE = 8,         // reserved: a machine in no state; none of them gives it
    DN_ERR_AFTER_QUOTES = 9,  // junk behind the closing quote
    DN_ERR_UNDEFINED = 10,    // attribute not defined in the schema
    DN_ERR_UTF8 = 34,         // bytes that can't be folded to upper case; the texts are there, and not to be used
    DN_ERR_TOO_LONG = 64,     // more than dn_longest bytes
    DN_ERR_NO_MEMORY = 90,
};

// The longest DN that is parsed, in bytes; blanks in front of it count.
DIRBASE_NUMBER(size_t, dn_longest, 2000);

// How an RDN takes its pairs.
DIRBASE_NUMBER(int, dn_order_given, 98);
DIRBASE_NUMBER(int, dn_order_sorted, 99);

// One pair of type and value.
typedef struct ldapRDN_struct33 ldapRDN_struct33;
struct ldapRDN_struct33 {
    char* type;
    char* value;     // bare: quotes and escapes resolved, any byte but 0
    int64_t syntax;  // syntax code (base/syntax_codes.h)

    size_t type_length;
    size_t value_length;
    size_t escaped_length;  // of the value as the canonical text has it
};

// A pair in the chain of its RDN. This link, the record behind it and both texts are one block.
typedef struct ldapRDN_elem33 ldapRDN_elem33;
struct ldapRDN_elem33 {
    ldapRDN_struct33* rdn;
    ldapRDN_elem33* next;
};

// One RDN.
typedef struct ldapDN_elem33 ldapDN_elem33;
struct ldapDN_elem33 {
    ldapRDN_elem33* pairs;
    int64_t count;         // of pairs
    uint64_t syntax_mask;  // the syntax codes of its attributes and-ed, from 1: 1 while all have SC_CIS, else 0
    uint32_t encrypted;    // 1 when one of its attributes is stored encrypted
    ldapDN_elem33* next;

    ldapRDN_elem33* last;  // pair
};

// A parsed DN.
typedef struct ldap_escDN ldap_escDN;
struct ldap_escDN {
    ldapDN_elem33* rdns;       // the most specific one first
    int64_t count;             // of RDNs
    int64_t length;            // of the input; of the canonical text once that is built
    uint64_t all_case_ignore;  // bit 0: every attribute has SC_CIS
    int64_t internal_error;    // 0 or one of dn_error
    int32_t result;            // the LDAP result that getRC made of it
    char* scratch;    // the cleaned DN: values as in the canonical text, types and order of pairs as written (with the
                      // schema, numeric types and those with "oid." in front by their first names); in the same
                      // block as the record. Empty in a record that no parse made.
    char* canonical;  // heap texts
    char* upper;

    ldapDN_elem33* last;  // RDN
};

// The working text of a parse, to which parse_escRDN appends. Where a name from the schema needs more room the record
// moves into a larger block: hold no other pointer to it meanwhile.
typedef struct ldap_escDN_work ldap_escDN_work;
struct ldap_escDN_work {
    ldap_escDN** dn;  // the record with the work area
    size_t length;    // bytes written
    size_t room;      // size of the work area
};

DIRBASE_C_BEGIN

// ---- parsing ------------------------------------------------------------------------------------------------------

// Parses a DN and builds its texts.
//
//   dn  zero-terminated UTF-8, at most dn_longest bytes; not changed, not kept. Empty or blank for the root.
//
// Returns a new record for the caller to release with free_ldap_escDN; null when dn is null or memory ran out. Its
// `result` is LDAP_SUCCESS, LDAP_UNDEFINED_TYPE, LDAP_INVALID_DN_SYNTAX or LDAP_NO_MEMORY and is to be looked at first.
// After any other result than LDAP_SUCCESS the texts are not to be used: empty mostly, null for a DN that is too long
// or without memory.
DIRBASE_EXPORT ldap_escDN* dn_normalize_esc(const char* dn);

// The same without the schema: types stay as they are written, and the upper text is in upper case throughout.
DIRBASE_EXPORT ldap_escDN* dn_normalize_light_esc(const char* dn);

// The same without setting `result`.
//
//   order   dn_order_sorted, or dn_order_given for pairs in the order in which they are written
//   schema  1 with the schema, 0 without
DIRBASE_EXPORT ldap_escDN* parse_escDN(const char* dn, int order, int schema);

// Parses the RDN at the beginning of a text.
//
//   text   not changed, not kept
//   rdn    takes its pairs; after an error those in front of the fault
//   work   takes the RDN's part of the working text, each pair with "+" behind it
//   error  0 or one of dn_error
//
// Returns the position behind the RDN (a separator or the end of the text), or where the fault is. An attribute that
// the schema doesn't know is told to the message log.
DIRBASE_EXPORT const char* parse_escRDN(const char* text, ldapDN_elem33* rdn, ldap_escDN_work* work, int order,
                                        int schema, int* error);

// Find the type at *start, and the value behind the "=" at *start. *start moves to the element's first character and
// *last to its last one; for an empty value *last is *start less one. Return the position of the "=", or of the
// separator or end behind the value. With *error not 0 that is the position of the fault, and *last isn't set.
DIRBASE_EXPORT const char* find_end_attr_type33(const char** start, const char** last, int* error);
DIRBASE_EXPORT const char* find_end_attr_value33(const char** start, const char** last, int* error);

// Resolves a value, up to its end or the first separator outside quotes (a "#" value must have no separator). Returns a
// new text for the caller to free(); null with *error DN_ERR_SYNTAX for a malformed value and DN_ERR_NO_MEMORY without
// memory.
DIRBASE_EXPORT char* normAttrValue(const char* value, int* error);

// The schema's first name, the shortest, of an attribute by any name or OID; null for an unknown one, and without
// memory for its record. `info` takes the record, or null. The name belongs to the record. The caller holds the read
// side of the schema lock.
DIRBASE_EXPORT const char* FirstRDNType_and_syntax(const char* type, asyntaxinfo** info);

// Whether a character of a value has to be escaped, and whether it may be: 1 or 0.
DIRBASE_EXPORT int needsEscape(char c);
DIRBASE_EXPORT int canEscape(char c);

// Sets `result` from `internal_error` and returns it; LDAP_INVALID_DN_SYNTAX for a null record.
DIRBASE_EXPORT int getRC(ldap_escDN* dn);

// ---- the texts ----------------------------------------------------------------------------------------------------

// Builds both texts of a record anew. With length 0 or an internal error both become empty. Returns the canonical text,
// which stays the record's; null when memory ran out, with internal error DN_ERR_NO_MEMORY and no texts.
DIRBASE_EXPORT char* BuildDNString33(ldap_escDN* dn);

// Builds the upper text of a record that BuildDNString33 has built, and returns it; it stays the record's. Bytes that
// can't be folded give internal error DN_ERR_UTF8; the text is then not to be used. Null when memory ran out, with
// DN_ERR_NO_MEMORY and the old text. A record with an internal error or without RDNs keeps its upper text, which is
// returned.
DIRBASE_EXPORT char* dn_upcase_esc(ldap_escDN* dn);

// Writes the pairs of one RDN as the upper text has them, "+" between them, and a terminator, to which *out moves.
// There must be room for the canonical text of the RDN and a terminator. What can't be folded stays as it is.
DIRBASE_EXPORT void dn_upcaseRDN(const ldapRDN_elem33* pairs, char** out);

// The texts of a record, which stay its own; null for a null record.
DIRBASE_EXPORT const char* GetDNString33(const ldap_escDN* dn);
DIRBASE_EXPORT const char* GetDNUpper33(const ldap_escDN* dn);

// ---- comparison and parents -----------------------------------------------------------------------------------------

// Return 1 when both are equal, else 0: as many RDNs, as many pairs, types equal without regard to case, and values
// too, each resolved once more by normAttrValue. A value that can't be resolved whole, or not for want of memory, is
// taken as it is. A null record and one with an internal error equal nothing.
DIRBASE_EXPORT int compare_ldap_escDN(const ldap_escDN* a, const ldap_escDN* b);
DIRBASE_EXPORT int compare_ldapDN_elem33(const ldapDN_elem33* a, const ldapDN_elem33* b);
DIRBASE_EXPORT int compare_ldapRDN33(const ldapRDN_struct33* a, const ldapRDN_struct33* b);

// A new record of all RDNs but the first, with the error and result of the given one, for the caller to release with
// free_ldap_escDN. Null for a null record or fewer than two RDNs, and without memory.
DIRBASE_EXPORT ldap_escDN* ParentDN33(const ldap_escDN* dn);

// A new text of all RDNs but the first with bare values, every RDN followed by ",", for the caller to free(): for
// people to read, since values with separators can't be told apart in it. Null for a null record, one with an internal
// error or fewer than two RDNs, and without memory.
DIRBASE_EXPORT char* getParentDn(const ldap_escDN* dn);

// A new upper text of all RDNs but the first, normalised by the active schema under the read side of the schema lock,
// which this function takes itself: the caller must hold neither side, as a waiting writer would stop both. Null as
// above, and when the parent's canonical text can't be normalised again.
DIRBASE_EXPORT char* getParentDnUpper(const ldap_escDN* dn);

// Replaces a DN by a copy of its upper text, where that differs.
//
//   dn       the place of a text
//   release  not 0: the replaced text is given to free()
//
// Returns LDAP_SUCCESS; LDAP_NO_MEMORY, or the result of the failed normalisation, and the text stays.
DIRBASE_EXPORT int replace_DN(char** dn, int release);

// ---- records and their chains ---------------------------------------------------------------------------------------

// New records for their free_ functions; null without memory. A record of a DN comes with a work area of `work` bytes,
// 1 at least.
DIRBASE_EXPORT ldap_escDN* new_ldap_escDN(size_t work);
DIRBASE_EXPORT ldapDN_elem33* new_ldapDN_elem33(void);
DIRBASE_EXPORT ldapRDN_elem33* new_ldapRDN_elem33(const char* type, const char* value, int64_t syntax);

// Release a record and all below it, not what is linked behind it. A null pointer, or a pointer to null, does nothing.
DIRBASE_EXPORT void free_ldap_escDN(ldap_escDN** dn);  // sets *dn to null
DIRBASE_EXPORT void free_ldapDN_elem33(ldapDN_elem33* rdn);
DIRBASE_EXPORT void free_ldapRDN_elem33(ldapRDN_elem33* pair);

// Put a pair into an RDN, by its order with dn_order_sorted and else at the end, and an RDN at the end of a DN. Both
// are counted and owned by what takes them. Masks, lengths and texts are the caller's to keep.
DIRBASE_EXPORT void insert_ldapRDN_elem33(ldapDN_elem33* rdn, ldapRDN_elem33* pair, int order);
DIRBASE_EXPORT void insert_ldapDN_elem33(ldap_escDN* dn, ldapDN_elem33* rdn);

// A deep copy of one RDN; null for null and without memory.
DIRBASE_EXPORT ldapDN_elem33* copy_ldapDN_elem33(const ldapDN_elem33* rdn);

DIRBASE_C_END
