// Entries as text: lines of LDIF (libraries/libldif/line64.h), the form in which back ends, tools and plug-ins pass
// them on.
//
//     42                                 the id, where it is wanted, alone on the first line
//     dn: cn=Bob,o=Acme
//     objectclass: person                a line for each value, the values of one attribute one after the other
//     cn:: TWFyw61h
//
// Attributes stand in their order of arrival under the names that they are stored with. An entry without a DN has no dn
// line, and such a text makes no entry. A text ends with its last line feed; in reading, an empty line ends it too. In
// the form without members each of `member` and `uniqueMember` is one line with the value "CN=NULL".
//
// Whoever calls holds the read side of the schema lock. An entry that is written isn't changed by anyone meanwhile.
// Texts go to a buffer of the caller's, and then any number of threads may write at once, or to the global one, and
// then the caller holds its mutex from before the call until he is done with the text.
#pragma once

#include <stddef.h>

#include "libraries/dirbase_export.h"
#include "servers/vrnd/libdirbase/model/entry.h"

// Bits of the options of entry2str_options.
DIRBASE_NUMBER(int, ENTRY_TEXT_ID, 0x01);  // with the id line, and "*" in place of each value of type-only attributes

DIRBASE_C_BEGIN

// ---- reading --------------------------------------------------------------------------------------------------------

// Makes an entry of a text.
//
//   text              zero-terminated; changed. Lines end in a line feed alone: a carriage return belongs to the line
//                     (line64.h).
//   check_duplicates  as drop_duplicates of attr_merge
//   normalize         as tree_mode of attr_merge
//   trim              not 0: lines of `member` and `uniqueMember` set their flag of e_flag, and are left out when their
//                     value is "CN=NULL"
//
// Lines without ":" or with bad Base64 are passed over, and so are all dn lines but the first. A DN that doesn't
// normalise gives an empty e_norm_dn. A URL isn't followed: it is the value.
//
// Returns a new entry for entry_free. Null, with a line in the debug log: for a null text, an id without further lines,
// no dn line, values that attr_merge refuses, and without memory.
DIRBASE_EXPORT Entry* str2entry_memberFix(char* text, int check_duplicates, int normalize, int trim);
DIRBASE_EXPORT Entry* str2entry(char* text, int check_duplicates, int normalize);

// ---- writing --------------------------------------------------------------------------------------------------------

// Write an entry into the global buffer. The text is valid until the mutex is released.
//
//   length    unless null takes the length of the text
//   options   ENTRY_TEXT_ bits; print_id is 1 or 0 for the first of them
//
// Return the text; null for a null entry and without memory.
DIRBASE_EXPORT char* entry2str_options(const Entry* entry, size_t* length, int options);
DIRBASE_EXPORT char* entry2str(const Entry* entry, size_t* length, int print_id);

// Write an entry without members.
//
//   print_id  not 0: with the id line; values of type-only attributes are written all the same
//   buffer    null for the global buffer. Else *buffer is a block of malloc, or null, and takes the one that it has
//             become, which stays the caller's, also after a failure.
//   size      of *buffer, 0 for a null one; takes the new one. Not used for the global buffer, else not null.
//   ignored   has no effect
//
// The second form also leaves out what keeps the password state (pwdChangedTime, pwdAccountLockedTime,
// pwdExpirationWarned, pwdFailureTime, pwdHistory, pwdGraceUseTime, pwdReset, xan-pwdAccountLocked and the DNs of group
// and individual policy) and attributes that the schema doesn't know.
//
// Return the text, which is *buffer, or null as above.
DIRBASE_EXPORT char* entry2str_wo_members(const Entry* entry, size_t* length, int print_id, char** buffer, size_t* size,
                                          int ignored);
DIRBASE_EXPORT char* entry2str_wo_members_and_pwd_attribs(const Entry* entry, size_t* length, int print_id,
                                                          char** buffer, size_t* size);

// ---- the buffer -----------------------------------------------------------------------------------------------------

// Makes room behind the cursor of a buffer. It grows by 1024 bytes, or for a need of more by the next multiple of 1024
// above it, until that is there.
//
//   needed  bytes
//   error   takes LDAP_SUCCESS, or LDAP_NO_MEMORY with the buffer as it was
//   buffer  *buffer is a block of malloc or null; with a new one the cursor moves along
//   cursor  *cursor is a position in it
//   size    of the buffer, 0 for null; takes the new one
DIRBASE_EXPORT void MAKE_SPACE(size_t needed, int* error, char** buffer, char** cursor, size_t* size);

// The global buffer: its start, the cursor in it, and its size. It grows and stays for the process.
DIRBASE_EXPORT extern char* ebuf_global;
DIRBASE_EXPORT extern char* ecur_global;
DIRBASE_EXPORT extern size_t emaxsize_global;

// Its mutex, entry2str_mutex, which isn't recursive. initEnt2StrMutex makes it, at start-up while there is one thread,
// and does nothing from the second call on.
DIRBASE_EXPORT void initEnt2StrMutex(void);
DIRBASE_EXPORT void lockEnt2StrMutex(void);
DIRBASE_EXPORT void unlockEnt2StrMutex(void);

DIRBASE_C_END
