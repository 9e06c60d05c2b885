// The configuration client: reads a configuration file as a small directory (README.md tells its format).
//
//     cfg_handle* cfg = cfg_init(nullptr, 0);
//     cfg_set_option(cfg, CFG_OPT_FILE, "/etc/server.conf");
//     cfg_message* result = nullptr;
//     if (cfg_bind_s(cfg, nullptr, nullptr, CFG_AUTH_SIMPLE) == LDAP_SUCCESS &&
//         cfg_search_s(cfg, "cn=configuration", CFG_SCOPE_SUB, "objectclass=*", nullptr, 0, &result) == LDAP_SUCCESS) {
//         for (cfg_message* e = cfg_first_entry(cfg, result); e != nullptr; e = cfg_next_entry(cfg, e)) {
//             ...
//         }
//         cfg_msgfree(result);
//     }
//     cfg_unbind(cfg);
//
// The file is read once, by cfg_bind_s; what becomes of it afterwards isn't seen. A call with a handle sets the
// handle's result code, which cfg_get_errno gives, but for cfg_get_errno, cfg_perror and cfg_dump_exception themselves
// and for the setting of a flag. Calls that return a code return the same one, and for the others a null result comes
// with LDAP_SUCCESS where there simply is nothing more. LDAP_PARAM_ERROR stands for a missing handle or argument, and
// nothing is given or done then; LDAP_NO_MEMORY for memory that ran out.
//
// Threads: a handle and the messages of its searches belong to one thread at a time; different handles may be used at
// once.
#pragma once

#include <stdint.h>

#include "libraries/dirbase_export.h"
#include "libraries/libber/ldap_result.h"

typedef struct cfg_handle cfg_handle;    // a session
typedef struct cfg_message cfg_message;  // the result of a search, and each of its entries
typedef struct cfg_ber cfg_ber;          // the position in an entry's attributes

// Options of a session and their values.
enum cfg_option DIRBASE_ENUM_INT {
    CFG_OPT_DUMP = 0x3e9,        // a flag: cfg_dump_exception writes what failed (off at first)
    CFG_OPT_DUMP_PLACE = 0x3ea,  // a flag: and where, by file and line (off at first)
    CFG_OPT_FILE = 0x3ed,        // const char*: path of the file. Setting it ends the session until the next bind.
    CFG_OPT_KEY = 0x3ef,         // const aes_key_data* (libpwd): decodes values kept in a two-way form; null for none
};

// The value that turns a flag on, as any pointer does; null turns it off.
#ifdef __cplusplus
#define CFG_OPT_ON (reinterpret_cast<const void*>(uintptr_t{1}))
#else
#define CFG_OPT_ON ((const void*)(uintptr_t)1)
#endif

DIRBASE_NUMBER(int, CFG_AUTH_SIMPLE, 0x80);

enum cfg_scope DIRBASE_ENUM_INT {
    CFG_SCOPE_BASE = 0,  // the entry itself
    CFG_SCOPE_ONE = 1,   // the entries right below it
    CFG_SCOPE_SUB = 2,   // the entry and all below it
};

DIRBASE_C_BEGIN

// ---- sessions -------------------------------------------------------------------------------------------------------

// Makes a session. Host and port are those of a configuration server, and there is none: null (or empty) and 0. Returns
// null for others, and when memory ran out.
DIRBASE_EXPORT cfg_handle* cfg_init(const char* host, int port);

// Sets an option. The value is copied. Returns LDAP_SUCCESS, LDAP_PARAM_ERROR (also for an unknown option) or
// LDAP_NO_MEMORY.
DIRBASE_EXPORT int cfg_set_option(cfg_handle* cfg, int option, const void* value);

// Reads the file. A file has no users, so name and password must be null or empty, and the method CFG_AUTH_SIMPLE.
// Returns
//
//   LDAP_SUCCESS
//   LDAP_PARAM_ERROR                no file was set
//   LDAP_LOCAL_ERROR                the file is missing, no regular file, longer than 16 MB, or can't be read
//   LDAP_DECODING_ERROR             a line that is none, or an entry that doesn't begin with its name
//   LDAP_INVALID_DN_SYNTAX          a malformed name
//   LDAP_ALREADY_EXISTS             a second entry of one name
//   LDAP_AUTH_METHOD_NOT_SUPPORTED  another method
//   LDAP_INAPPROPRIATE_AUTH         name or password
//   LDAP_NO_MEMORY
//
// After a failure the session is as it was before: unbound, or on what an earlier bind had read.
DIRBASE_EXPORT int cfg_bind_s(cfg_handle* cfg, const char* name, const char* password, int method);

// Ends a session; null does nothing. Results of its searches stay good: any other handle reads them, and decodes their
// values by its own key. Returns LDAP_SUCCESS.
DIRBASE_EXPORT int cfg_unbind(cfg_handle* cfg);

// ---- searching ------------------------------------------------------------------------------------------------------

// Looks for entries.
//
//   base        DN, compared as README.md tells for names; empty for the root, which is no entry itself
//   scope       cfg_scope
//   filter      "attribute=value" or "attribute=*", in parentheses or not (RFC 4515 section 3, without its other
//               forms). A value equals another without regard to ASCII case, and encoded ones as they stand in the
//               file. "objectclass=*" takes every entry.
//   attributes  null: entries are always given whole
//   types_only  0
//   result      takes a message for cfg_msgfree, with any number of entries, parents ahead of their children; null on
//               failure
//
// Returns LDAP_SUCCESS, LDAP_NO_SUCH_OBJECT for a base that isn't in the file, LDAP_INVALID_DN_SYNTAX,
// LDAP_PARAM_ERROR, LDAP_FILTER_ERROR for a filter that isn't of these forms, LDAP_NOT_SUPPORTED where attributes are
// chosen, LDAP_OPERATIONS_ERROR when nothing is bound, or LDAP_NO_MEMORY.
DIRBASE_EXPORT int cfg_search_s(cfg_handle* cfg, const char* base, int scope, const char* filter, char** attributes,
                                int types_only, cfg_message** result);

// Walk the entries of a result; they belong to it. Null behind the last one.
DIRBASE_EXPORT cfg_message* cfg_first_entry(cfg_handle* cfg, cfg_message* result);
DIRBASE_EXPORT cfg_message* cfg_next_entry(cfg_handle* cfg, cfg_message* entry);

// The number of entries from `result` on; -1 for a null argument.
DIRBASE_EXPORT int cfg_count_entries(cfg_handle* cfg, cfg_message* result);

// Releases a result with its entries; null does nothing. Returns LDAP_SUCCESS.
DIRBASE_EXPORT int cfg_msgfree(cfg_message* result);

// ---- reading entries ------------------------------------------------------------------------------------------------

// The name of an entry as it is written, for cfg_memfree.
DIRBASE_EXPORT char* cfg_get_dn(cfg_handle* cfg, cfg_message* entry);

// Walk the names of an entry's attributes, in the order of the file. Each name is for cfg_memfree. *cursor takes the
// position, for cfg_ber_free; it is null when the first call gives no name.
DIRBASE_EXPORT char* cfg_first_attribute(cfg_handle* cfg, cfg_message* entry, cfg_ber** cursor);
DIRBASE_EXPORT char* cfg_next_attribute(cfg_handle* cfg, cfg_message* entry, cfg_ber* cursor);

// The values of an attribute (any case) in the order of the file: zero-terminated texts in a null-terminated array for
// cfg_value_free. With a key, values in a two-way form of libpwd are decoded; without one, and in any other form, they
// are given as they stand. Null with LDAP_NO_SUCH_ATTRIBUTE, or with LDAP_DECODING_ERROR for a value that the key
// doesn't decode to a text.
DIRBASE_EXPORT char** cfg_get_values(cfg_handle* cfg, cfg_message* entry, const char* attribute);

// Release what the calls above gave. Values are overwritten first, for there may be passwords among them, and so are
// the file's text and the values that a session keeps of it. Null does nothing.
DIRBASE_EXPORT void cfg_value_free(char** values);
DIRBASE_EXPORT void cfg_memfree(void* text);
DIRBASE_EXPORT void cfg_ber_free(cfg_ber* cursor);

// ---- failures -------------------------------------------------------------------------------------------------------

// The code of the last call with this handle; LDAP_PARAM_ERROR for null.
DIRBASE_EXPORT int cfg_get_errno(cfg_handle* cfg);

// Tell the debug log of the last call's failure, or nothing after a success. cfg_perror puts `step` in front, and names
// line and file (the one that is set); cfg_dump_exception writes what CFG_OPT_DUMP and CFG_OPT_DUMP_PLACE ask for.
// Neither sets the code.
DIRBASE_EXPORT void cfg_perror(cfg_handle* cfg, const char* step);
DIRBASE_EXPORT void cfg_dump_exception(cfg_handle* cfg);

DIRBASE_C_END
