// One whole schema: its definitions under every name they answer to, and the files that they belong to.
//
// Two instances live as long as the process. One is the active schema that every look-up reads; the other is empty
// except while a change is voted on. A change is made on a copy in the second and takes effect by moving one pointer
// (ldcf_schema_modify.h), so readers never see half of it.
//
// A schema file is a sequence of sections: a keyword (ldapSyntaxes, matchingRules, attributeTypes, XANattributeTypes,
// objectClasses), then ":" or "=" and one definition, or "{", definitions and "}". A "#" comment may stand ahead of a
// section. The definitions are those of RFC 4512, section 4.1, and the server's extended attribute types.
//
// The class has no lock: a schema is built and changed by one thread while nobody else reads it. All failures are
// exceptions of the tree of csgl_exception.h.
#pragma once

#include "servers/vrnd/libdirbase/schema/ldcf_attrtype.h"
#include "servers/vrnd/libdirbase/schema/ldcf_matchrule.h"
#include "servers/vrnd/libdirbase/schema/ldcf_objclass.h"
#include "servers/vrnd/libdirbase/schema/ldcf_syntax.h"

// What a definition is called in messages: "syntax", "matching rule", "attribute type" or "object class".
DIRBASE_EXPORT const char* ldcf_kind_of(const ldcf_syntax& definition);
DIRBASE_EXPORT const char* ldcf_kind_of(const ldcf_matchrule& definition);
DIRBASE_EXPORT const char* ldcf_kind_of(const ldcf_attrtype& definition);
DIRBASE_EXPORT const char* ldcf_kind_of(const ldcf_objclass& definition);

struct DIRBASE_EXPORT ldcf_schema {
    // Whether a schema file has changes that are not yet on disk. A file name that is met for the first time starts as
    // modified.
    enum class modified_indicator : int { modified = 0, flushed = 1 };
    using file_map = csgl_map<csgl_string, modified_indicator>;

    ldcf_schema() = default;

    // Definitions refer to each other in circles (a type and its subtypes); unlinks them, so that all are freed.
    ~ldcf_schema();

    ldcf_schema(const ldcf_schema&) = delete;
    ldcf_schema& operator=(const ldcf_schema&) = delete;

    // Reads a whole schema file, of less than 2 GB, which becomes current_file. A failure inside its text leaves the
    // definitions read so far, and `files` and current_file as they were. A file that can't be read whole is
    // exc_end_of_input_t and adds nothing: it is shorter or longer than it claimed, or holds a byte 0, which would end
    // its text.
    void parse(const char* file);

    // Reads schema text, zero-terminated. `file` names it in messages and becomes the home of the definitions.
    void parse_str(const char* text, const char* file);

    // Link every definition to what it refers to; the first also runs check. A failure leaves the schema unfit for use
    // until incomplete.
    void complete();
    void complete_nocheck();

    // Undoes the links.
    void incomplete() noexcept;

    // Works out the names in the relational store of every attribute type.
    void complete_db_names();

    // Proves that the syntaxes and matching rules that the server relies on are there and say what they must. Raises
    // exc_does_not_exist_t or exc_invalid_state_t.
    void check() const;

    // Makes this empty schema a deep copy of another, which stays as it is.
    ldcf_schema& copy(const ldcf_schema& from);

    // Take a definition in: it is homed in current_file and linked. An oid or name that exists is exc_ldap_rc_t with
    // LDAP_TYPE_OR_VALUE_EXISTS. No other schema may hold it any longer: that one unlinks it when it is cleared or
    // goes.
    void insert(ldcf_syntax& definition);
    void insert(ldcf_matchrule& definition);
    void insert(ldcf_attrtype& definition);
    void insert(ldcf_objclass& definition);

    // Take the definition out that has the oid of the given one, or that name in its place; it may be any parsed one.
    // An oid or name that doesn't exist is exc_ldap_rc_t with LDAP_NO_SUCH_ATTRIBUTE, names of another definition are
    // exc_invalid_input_t, and a definition that others use is exc_invalid_state_t.
    void erase(ldcf_syntax& definition);
    void erase(ldcf_matchrule& definition);
    void erase(ldcf_attrtype& definition);
    void erase(ldcf_objclass& definition);

    // Let the definition with this oid say what the given one says, in its place and its home files. An oid that
    // doesn't exist is exc_ldap_rc_t with LDAP_NO_SUCH_ATTRIBUTE, a name of another definition exc_invalid_input_t.
    void replace(ldcf_syntax& definition);
    void replace(ldcf_matchrule& definition);
    void replace(ldcf_attrtype& definition);
    void replace(ldcf_objclass& definition);

    // Write the temporary file (file_suffix behind the name) of every modified file, or of one file.
    void flush() const;
    void flush(const csgl_string& file) const;

    // Put the temporary files in the place of the modified files. When one can't be, those already replaced are put
    // back and the failure is raised; all stay marked modified. What a killed process leaves of this is told in
    // ldcf_schema_recover.h.
    void flush_commit();

    // Removes the temporary files of the modified files, which count as flushed then. A missing one is passed over; of
    // other failures the first is raised when all are done. Where a failed commit could not put a file back, and it
    // can't be now, the temporary files stay: without them the next start would take the commit for one that was
    // through.
    void flush_rollback();

    // Unlinks and drops all definitions and forgets all files.
    void clear() noexcept;

    ldcf_map_name_to<ldcf_syntax> syntaxes;
    ldcf_map_name_to<ldcf_matchrule> matching_rules;
    ldcf_map_name_to<ldcf_attrtype> attribute_types;
    ldcf_map_name_to<ldcf_objclass> object_classes;
    file_map files;
    csgl_string current_file;  // the file parsed last, the home of new definitions

private:
    DIRBASE_HIDDEN void parse_section(ldcf_token_factory& factory, const ldcf_token& keyword);
    template <typename T, typename Map>
    DIRBASE_HIDDEN void replace_in(const char* kind, T& definition, Map& map);
};

extern "C" {

// The active schema; never null.
DIRBASE_EXPORT extern ldcf_schema* ldcf_schema_g;

// The schema of the change in progress; null before the first one, and the active schema when a change is through.
DIRBASE_EXPORT extern ldcf_schema* ldcf_schema_proposed_g;

// The type by which the schema back end stands on the list of back ends, "ldcf".
DIRBASE_EXPORT extern const char* const LDCF;

// What stands behind a schema file's name in the name of its temporary file, ".tmp".
DIRBASE_EXPORT extern const char* const file_suffix;

}  // extern "C"
