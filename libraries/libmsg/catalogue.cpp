// The catalogue's table and the look-up in it. The table is checked while it is compiled: its order, and every place.
#include "libraries/libmsg/catalogue.h"

#include <algorithm>
#include <iterator>
#include <string_view>

#include "libraries/libmsg/message_format.h"
#include "libraries/libmsg/message_log.h"

namespace {

struct catalogue_entry {
    int component;
    int id;
    const char* text;
};

constexpr bool operator<(const catalogue_entry& a, const catalogue_entry& b)
{
    return a.component != b.component ? a.component < b.component : a.id < b.id;
}

// The front of every text that is raised at a place in schema text. A caller that shows such a text to a client over
// LDAP cuts it off up to and including the source and ": ", so the source stands last.
#define AT_PLACE "line %2$d of %1$s: "

constexpr catalogue_entry catalogue[] = {
    {MSG_COMPONENT_SERVER, 5, "Connection %1$d of client %2$s: request %3$d could not be decoded (%4$s)."},
    {MSG_COMPONENT_SERVER, 7, "The server is out of memory."},
    {MSG_COMPONENT_SERVER, 92, "The modification of attribute %1$s has no values."},
    {MSG_COMPONENT_SERVER, 106, "A tree of the server is damaged: %1$s."},
    {MSG_COMPONENT_SERVER, 168, "The attribute %1$s of an attribute mapping is not defined in the schema."},
    {MSG_COMPONENT_SERVER, 170, "The attribute name %1$s of an attribute mapping is not well-formed."},
    {MSG_COMPONENT_SERVER, 171, "The attribute mapping %1$s is not of the form name$name."},

    {MSG_COMPONENT_OPERATION, 157,
     "The attribute %1$s is encrypted and can be searched for only by equality and presence."},
    {MSG_COMPONENT_OPERATION, 158, "The attribute %1$s is encrypted one way and can be searched for only by presence."},
    {MSG_COMPONENT_OPERATION, 159, "The attribute %1$s can not be used in search filters."},
    {MSG_COMPONENT_OPERATION, 160, "The attribute %1$s can be searched for only over a secure connection."},

    {MSG_COMPONENT_SCHEMA, 1, AT_PLACE "expected %3$s, but could not find it at or before %4$s"},
    {MSG_COMPONENT_SCHEMA, 2, AT_PLACE "expected one of the following: %3$s, but could not find it at or before %4$s"},
    {MSG_COMPONENT_SCHEMA, 3, AT_PLACE "expected digit after '.', but could not find it at or before %3$s"},
    {MSG_COMPONENT_SCHEMA, 4, AT_PLACE "expected non-empty quoted string, but could not find it at or before %3$s"},
    {MSG_COMPONENT_SCHEMA, 5, AT_PLACE "expected %3$s, but could not find it at or before %4$s"},
    {MSG_COMPONENT_SCHEMA, 6, AT_PLACE "expected %3$s, but could not find it at or before %4$s"},
    {MSG_COMPONENT_SCHEMA, 7, AT_PLACE "expected qdstring, but could not find it at or before %3$s"},
    {MSG_COMPONENT_SCHEMA, 8, AT_PLACE "expected %3$s, but could not find it at or before %4$s"},
    {MSG_COMPONENT_SCHEMA, 9, AT_PLACE "expected descr, but could not find it at or before %3$s"},
    {MSG_COMPONENT_SCHEMA, 10, AT_PLACE "expected qdescr, but could not find it at or before %3$s"},
    {MSG_COMPONENT_SCHEMA, 11, AT_PLACE "expected %3$s, but could not find it at or before %4$s"},
    {MSG_COMPONENT_SCHEMA, 12, AT_PLACE "non-terminated quoted string %3$s"},
    {MSG_COMPONENT_SCHEMA, 13, AT_PLACE "unexpected end of input"},
    {MSG_COMPONENT_SCHEMA, 14, AT_PLACE "invalid token %3$s"},
    {MSG_COMPONENT_SCHEMA, 15, AT_PLACE "expected usage specification, but could not find it at or before %3$s"},
    {MSG_COMPONENT_SCHEMA, 16,
     AT_PLACE "expected one or two quoted strings (database table and/or column names), "
              "but could not find it at or before %3$s"},
    {MSG_COMPONENT_SCHEMA, 17, AT_PLACE "expected ACCESS-CLASS specification, but could not find it at or before %3$s"},
    {MSG_COMPONENT_SCHEMA, 18, AT_PLACE "%3$s %4$s has already been defined"},
    {MSG_COMPONENT_SCHEMA, 19, AT_PLACE "duplicate definition of %3$s %4$s"},
    {MSG_COMPONENT_SCHEMA, 20, AT_PLACE "attribute type %3$s already has an XAN extended definition"},
    {MSG_COMPONENT_SCHEMA, 21,
     AT_PLACE "all alternate definitions of same %3$s must be in a single file: %4$s is also defined in %5$s"},
    {MSG_COMPONENT_SCHEMA, 22, AT_PLACE "inconsistent %3$s %4$s and %5$s (with OID %6$s)"},
    {MSG_COMPONENT_SCHEMA, 23, AT_PLACE "%3$s %4$s must have a syntax."},
    {MSG_COMPONENT_SCHEMA, 24, "invalid op value; Expected one of the following operation: %1$s"},
    {MSG_COMPONENT_SCHEMA, 25, "%1$s %2$s not found when processing %3$s %4$s"},
    {MSG_COMPONENT_SCHEMA, 26, "%1$s %2$s does not exist"},
    {MSG_COMPONENT_SCHEMA, 27, "%1$s %2$s does not exist"},
    {MSG_COMPONENT_SCHEMA, 28, "%1$s %2$s (oid %3$s) does not have a syntax"},
    {MSG_COMPONENT_SCHEMA, 29, "%1$s: OID %2$s and %3$s do not refer to the same %4$s"},
    {MSG_COMPONENT_SCHEMA, 30, "%1$s: OID %2$s and %3$s do not refer to the same %4$s"},
    {MSG_COMPONENT_SCHEMA, 31, "%1$s %2$s already exists"},
    {MSG_COMPONENT_SCHEMA, 32, "%1$s %2$s can not be deleted; its refcount is %3$s.  It should be %4$s"},
    {MSG_COMPONENT_SCHEMA, 33, "missing LDAPv3 spec for attribute %1$s"},
    {MSG_COMPONENT_SCHEMA, 34, "%1$s %2$s and its supertype %3$s have different usages"},
    {MSG_COMPONENT_SCHEMA, 35, "There is a cycle in the supertype specification: %1$s"},
    {MSG_COMPONENT_SCHEMA, 36, "There is a cycle in the supertype specification: %1$s"},
    {MSG_COMPONENT_SCHEMA, 37, " Error %1$s %2$s was not provided; must be provided as %3$s"},
    {MSG_COMPONENT_SCHEMA, 38, " Error %1$s %2$s must be provided as %3$s was provided as %4$s"},
    {MSG_COMPONENT_SCHEMA, 39,
     " Error %1$s %2$s must be provided as %3$s with inherited properties or XAN extensions %4$s "
     "was provided as %5$s with inherited properties or XAN extensions %6$s"},
    {MSG_COMPONENT_SCHEMA, 40, " Error the XAN extension for %1$s %2$s must be provided as %3$s was provided as %4$s"},
    {MSG_COMPONENT_SCHEMA, 41, AT_PLACE "expected ENCRYPT specification, but could not find it at or before %3$s"},
    {MSG_COMPONENT_SCHEMA, 42, AT_PLACE "expected RETURN-VALUE specification, but could not find it at or before %3$s"},
    {MSG_COMPONENT_SCHEMA, 43, "Attribute %1$s cannot be encypted.  Syntax %2$s is not allowed to be encrypted."},
    {MSG_COMPONENT_SCHEMA, 44,
     "Attribute %1$s cannot be encypted. Special attributes are not allowed to be encrypted."},
    {MSG_COMPONENT_SCHEMA, 45, "The protection of attribute %1$s has been changed: %2$s"},
    {MSG_COMPONENT_SCHEMA, 46, "The %1$s matching rule %2$s of attribute %3$s is not valid for its syntax %4$s."},
    {MSG_COMPONENT_SCHEMA, 47, "Password attribute %1$s cannot be encypted in the schema."},
    {MSG_COMPONENT_SCHEMA, 48, "%1$s already exists with the specified OID: %2$s"},
    {MSG_COMPONENT_SCHEMA, 49,
     "The %1$s matching rule %2$s of attribute %3$s differs from its EQUALITY matching rule in case sensitivity."},

    {MSG_COMPONENT_RDBM, 7, "The entry %1$s has no object class."},
    {MSG_COMPONENT_RDBM, 8, "The attribute %1$s is required, and missing from the entry %2$s."},
    {MSG_COMPONENT_RDBM, 9, "The attribute %1$s is not allowed in the entry %2$s."},
    {MSG_COMPONENT_RDBM, 13, "The attribute %1$s is not defined in the schema."},
    {MSG_COMPONENT_RDBM, 26, "The object class %1$s is not defined in the schema."},
    {MSG_COMPONENT_RDBM, 28, "The conversion between UTF-8 and the local code page %1$s is not available."},
    {MSG_COMPONENT_RDBM, 29, "A text could not be converted between UTF-8 and the local code page."},
    {MSG_COMPONENT_RDBM, 30, "The table name %1$s is too long for the store and has been cut to %2$s."},
    {MSG_COMPONENT_RDBM, 31, "The column name %1$s is too long for the store and has been cut to %2$s."},
    {MSG_COMPONENT_RDBM, 32, "The generated table name %1$s is too long for the store and has been replaced by %2$s."},
};

#undef AT_PLACE

constexpr bool every_percent_sign_is_meant(std::string_view text)
{
    while (!text.empty()) {
        std::size_t length = 1;
        if (text[0] == '%') {
            length = text.substr(0, 2) == "%%" ? 2 : read_place(text).length;
            if (length == 0)
                return false;
        }
        text.remove_prefix(length);
    }
    return true;
}

constexpr bool well_formed()
{
    for (std::size_t i = 0; i < std::size(catalogue); ++i) {
        if (i > 0 && !(catalogue[i - 1] < catalogue[i]))
            return false;
        if (!every_percent_sign_is_meant(catalogue[i].text))
            return false;
    }
    return true;
}

static_assert(well_formed(), "the catalogue is out of order, or one of its texts has a percent sign that is no place");

}  // namespace

const char* catalogue_text(int component, int id)
{
    const catalogue_entry wanted = {component, id, nullptr};
    const catalogue_entry* found = std::lower_bound(std::begin(catalogue), std::end(catalogue), wanted);
    if (found == std::end(catalogue) || wanted < *found)
        return nullptr;
    return found->text;
}

const char* catalogue_component(int component)
{
    switch (component) {
    case MSG_COMPONENT_SERVER: return "SRV";
    case MSG_COMPONENT_OPERATION: return "OPR";
    case MSG_COMPONENT_SCHEMA: return "SCH";
    case MSG_COMPONENT_RDBM: return "RDB";
    default: return nullptr;
    }
}
