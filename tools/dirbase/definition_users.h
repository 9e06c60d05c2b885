// Who uses a definition: for the user who may not delete it, and gets no more than a count of references from the
// library.
#pragma once

#include <string>

#include "servers/vrnd/libdirbase/schema/ldcf_schema.h"

namespace dirbase_tool {

// "still used by attribute type 'a', object class 'b' and 3 more", about the definition of a complete schema that has
// the oid of the given one; empty when there is none, or nothing uses it.
std::string note_of_users(const ldcf_syntax& definition, const ldcf_schema& schema);
std::string note_of_users(const ldcf_matchrule& definition, const ldcf_schema& schema);
std::string note_of_users(const ldcf_attrtype& definition, const ldcf_schema& schema);
std::string note_of_users(const ldcf_objclass& definition, const ldcf_schema& schema);

}  // namespace dirbase_tool
