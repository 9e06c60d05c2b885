// Search filters: the tree, its release, and its text (RFC 4511 section 4.5.1, RFC 4515).
//
// A filter is a tree of records. It comes from BER (connection/filter_ber.h) or from text (str2filter.h), and is then
// nested FILTER_MAX_DEPTH deep at most; test_filter (filter_evaluation.h) evaluates it. Everything here descends by
// recursion, a small frame for each level, so it is safe at that depth. Records, texts and arrays are blocks of malloc
// that the filter owns.
//
// Nothing here locks: a filter is changed by one thread at a time, and read by any number while nobody changes it.
#pragma once

#include <stdint.h>

#include "libraries/dirbase_export.h"
#include "libraries/libber/berval.h"

// What f_choice holds: the tag of the choice in BER.
DIRBASE_NUMBER(uint64_t, LDAP_FILTER_AND, 0xa0);
DIRBASE_NUMBER(uint64_t, LDAP_FILTER_OR, 0xa1);
DIRBASE_NUMBER(uint64_t, LDAP_FILTER_NOT, 0xa2);
DIRBASE_NUMBER(uint64_t, LDAP_FILTER_EQUALITY, 0xa3);
DIRBASE_NUMBER(uint64_t, LDAP_FILTER_SUBSTRINGS, 0xa4);
DIRBASE_NUMBER(uint64_t, LDAP_FILTER_GE, 0xa5);
DIRBASE_NUMBER(uint64_t, LDAP_FILTER_LE, 0xa6);
DIRBASE_NUMBER(uint64_t, LDAP_FILTER_PRESENT, 0x87);
DIRBASE_NUMBER(uint64_t, LDAP_FILTER_APPROX, 0xa8);
DIRBASE_NUMBER(uint64_t, LDAP_FILTER_EXTENDED, 0xa9);  // never in a record

// The tags of the pieces of a substring filter in BER.
DIRBASE_NUMBER(unsigned, LDAP_SUBSTRING_INITIAL, 0x80);
DIRBASE_NUMBER(unsigned, LDAP_SUBSTRING_ANY, 0x81);
DIRBASE_NUMBER(unsigned, LDAP_SUBSTRING_FINAL, 0x82);

// The deepest nesting that is parsed: "(a=b)" is one level, "(!(a=b))" two.
DIRBASE_NUMBER(unsigned, FILTER_MAX_DEPTH, 100);

// An assertion about an attribute's value.
typedef struct ava ava;
struct ava {
    char* ava_type;
    berval ava_value;    // in normal form, once it was parsed so; a zero byte stands behind the bytes
    berval ava_encoded;  // for an attribute encrypted two ways the value in its stored form, else empty
};

// What a substring filter looks for. Pieces are zero-terminated texts; those that aren't wanted are null.
typedef struct filter_substrings filter_substrings;
struct filter_substrings {
    char* f_sub_type;
    char* f_sub_initial;
    char** f_sub_any;  // in their order; null-terminated (charray.h)
    char* f_sub_final;
};

typedef struct Filter Filter;
struct Filter {
    uint64_t f_choice;
    union {
        Filter* f_list;           // AND, OR, NOT: the first child, the others behind it by f_next
        char* f_type;             // presence
        ava f_ava;                // equality, the orderings, approximate match
        filter_substrings f_sub;  // substrings
    };
    Filter* f_next;  // the next child of the same parent
};

DIRBASE_C_BEGIN

// Zeroes a record.
DIRBASE_EXPORT void ava_init(ava* assertion);

// Releases the three texts, and with `free_record` not 0 the record itself. Else the record is zeroed. Null does
// nothing.
DIRBASE_EXPORT void ava_free(ava* assertion, int free_record);

// Releases a filter with all its children, but not the filters behind it. Null does nothing.
DIRBASE_EXPORT void filter_free(Filter* filter);

// The text of a filter. Values stand as they are, up to their first zero byte, and nothing is escaped: the text of a
// value with "(", ")", "*" or a backslash can't be parsed back. A new text for the caller to free(); null for a null
// filter, and with a line in the debug log for an unknown choice and without memory.
DIRBASE_EXPORT char* filter2str(const Filter* filter);

// Prints that text and a line feed to standard output, for debugging; "(no filter)" where there is no text.
DIRBASE_EXPORT void filter_print(const Filter* filter);

// Exchanges the value and its stored form in each assertion along f_next that has one; children are left alone. So a
// back end compares with what it has stored, and swaps back. Returns 1 when the last filter was swapped, else 0.
DIRBASE_EXPORT int filter_swap_with_encoded(Filter* filter);

DIRBASE_C_END

#ifdef __cplusplus

// Whether a choice has children, or an assertion.
constexpr bool filter_has_list(uint64_t choice)
{
    return choice == LDAP_FILTER_AND || choice == LDAP_FILTER_OR || choice == LDAP_FILTER_NOT;
}
constexpr bool filter_has_ava(uint64_t choice)
{
    return choice == LDAP_FILTER_EQUALITY || choice == LDAP_FILTER_GE || choice == LDAP_FILTER_LE ||
           choice == LDAP_FILTER_APPROX;
}

// What stands between type and value of an assertion.
constexpr const char* filter_comparison(uint64_t choice)
{
    return choice == LDAP_FILTER_GE       ? ">="
           : choice == LDAP_FILTER_LE     ? "<="
           : choice == LDAP_FILTER_APPROX ? "~="
                                          : "=";
}

#endif
