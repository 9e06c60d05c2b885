// Filters of search requests, from BER (RFC 4511 section 4.5.1), and the assertions of compare requests.
//
// While a filter is read its values are normalised by the syntax of their attribute, and what the attribute's rules
// forbid is refused. What can't be evaluated, since the schema doesn't know the attribute or the value can't be one of
// its values, is undefined and not a failure: it is left out of an OR, and makes an AND or a NOT undefined as a whole.
// An undefined filter is LDAP_SUCCESS with no filter: such a search finds nothing. An AND or OR without a defined
// member is undefined, so an empty one is, too (it isn't the absolute true or false of RFC 4526).
//
// Reading takes time and memory in proportion to the encoding and to its depth, which is FILTER_MAX_DEPTH at most. All
// lengths are held against the construction that they stand in; unknown members at the end of an assertion are passed
// over, as the protocol asks (RFC 4511 section 4).
//
// Texts and records that these functions give are blocks of malloc for the caller to release; pointers that take them
// aren't null, except where it says so. Each call works on what it is given. The caller holds the read side of the
// schema lock (ldcf_api_get_modify_attr_info_lock_g). A schema record that there is no memory for looks like an unknown
// attribute, and a string like one that isn't there.
#pragma once

#include <stdint.h>

#include "libraries/dirbase_export.h"
#include "libraries/libber/ber_element.h"
#include "servers/vrnd/libdirbase/connection/connection.h"
#include "servers/vrnd/libdirbase/model/filter.h"
#include "servers/vrnd/libdirbase/schema/asyntaxinfo.h"

DIRBASE_C_BEGIN

// Reads the filter at the position of an element.
//
//   conn        whose request it is; null for none (nothing is known about it then: it counts as not secure)
//   filter      takes a new filter for filter_free; null when it is undefined and on failure
//   text        takes its canonical text for logs, with "(", ")", "*" and backslash of values written as a backslash
//               and two hexadecimal digits, and values up to their first byte 0; null when there is no filter
//   error_text  may be null. Where a failure has words for the client takes a new text, without a look at what was
//               there, and is left alone else.
//
// Returns LDAP_SUCCESS;
//   LDAP_PROTOCOL_ERROR             no filter is there
//   LDAP_CONFIDENTIALITY_REQUIRED, LDAP_UNWILLING_TO_PERFORM
//                                   of filter_check_attr_constraints
//   LDAP_UNWILLING_TO_PERFORM       more than FILTER_MAX_DEPTH levels, with words for the client
//   LDAP_INVALID_SYNTAX, or another failure of value_normalize
//                                   a value isn't of its attribute's syntax or a text with a byte 0, or a piece of a
//                                   substring filter is empty (one whose normal form is empty, as that of "-" in a
//                                   telephone number, is legal)
//   LDAP_NO_MEMORY
// The position is behind the filter only when the result is LDAP_SUCCESS.
DIRBASE_EXPORT int get_filter(const Connection* conn, BerElement* ber, Filter** filter, char** text, char** error_text);

// Reads the members of the set at the position, as get_filter does.
//
//   list    takes the first filter, the others behind it by f_next; null when there is none
//   text    takes their texts joined; null when there is none
//   choice  LDAP_FILTER_AND: with an undefined member there is no list; LDAP_FILTER_OR: undefined members are left out;
//           with any other choice they are a failure, LDAP_OPERATIONS_ERROR
DIRBASE_EXPORT int get_filter_list(const Connection* conn, BerElement* ber, Filter** list, char** text, uint64_t choice,
                                   char** error_text);

// Reads the substring filter at the position into a record, whose f_choice and f_sub are set; what they held isn't
// looked at.
//
//   text  takes the text; null on failure
//
// Returns what get_filter does, and where that is silent LDAP_NO_SUCH_ATTRIBUTE for an attribute that the schema
// doesn't know, behind which the position is then, and LDAP_CONSTRAINT_VIOLATION for a piece longer than the
// attribute's column. What was read before a failure is in the record, for filter_free.
DIRBASE_EXPORT int get_substring_filter(const Connection* conn, BerElement* ber, Filter* filter, char** text,
                                        char** error_text);

// Reads the assertion at the position for a filter of this choice. The attribute "debug" takes any value, as it stands.
//
// Returns as get_substring_filter. The assertion is zeroed on failure, and else for ava_free.
DIRBASE_EXPORT int get_ava_for_filter(const Connection* conn, BerElement* ber, ava* assertion, uint64_t choice,
                                      char** error_text);

// Reads the assertion of a compare request: a value that its syntax refuses is taken as it is. Returns LDAP_SUCCESS,
// with the assertion for ava_free(assertion, 0); or LDAP_PROTOCOL_ERROR, also without memory, with message 5 and the
// assertion zeroed.
DIRBASE_EXPORT int get_ava(BerElement* ber, ava* assertion);

// Whether a filter of this choice may be put to an attribute on this connection. get_filter asks for all choices but
// presence.
//
//   info        null, for an attribute that isn't known, permits all
//   error_text  may be null. Takes words for the client, a new block of 1000 bytes, when it is refused; null without
//               memory.
//
// Returns LDAP_SUCCESS; LDAP_UNWILLING_TO_PERFORM for anything but presence of an attribute encrypted one way, anything
// but presence and equality of one encrypted two ways, and an attribute that isn't to be matched;
// LDAP_CONFIDENTIALITY_REQUIRED for an attribute that needs a secure connection, on one that is neither bound, nor
// secure, nor audited; LDAP_SUCCESS for any other choice than those of filter.h, extensible match among them.
DIRBASE_EXPORT int filter_check_attr_constraints(const Connection* conn, uint64_t choice, const asyntaxinfo* info,
                                                 char** error_text);

// The text of a value in a filter: "(", ")", "*" and backslash as a backslash and two hexadecimal digits, all other
// bytes as they are.
//
//   value  of `length` bytes
//   text   takes a new text, zero-terminated; null on failure
//
// Returns LDAP_SUCCESS or LDAP_NO_MEMORY.
DIRBASE_EXPORT int expand_filter_value(const char* value, unsigned long length, char** text);

DIRBASE_C_END
