// See small_schema.h.
#include "fuzz/support/small_schema.h"

#include "fuzz/support/fuzz_support.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api.h"

namespace {

constexpr char definitions[] = R"(
ldapSyntaxes { ( 1.3.6.1.4.1.1466.115.121.1.15 ) }
matchingRules {
    ( 2.5.13.2 NAME 'caseIgnoreMatch' SYNTAX 1.3.6.1.4.1.1466.115.121.1.15 )
    ( 2.5.13.5 NAME 'caseExactMatch' SYNTAX 1.3.6.1.4.1.1466.115.121.1.15 )
}
attributeTypes {
    ( 2.2 NAME 'name' EQUALITY caseIgnoreMatch SYNTAX 1.3.6.1.4.1.1466.115.121.1.15 )
    ( 2.3 NAME ( 'c' 'cn' 'commonName' ) SUP name )
    ( 2.4 NAME ( 'sn' 'surname' ) SUP name )
    ( 1.1 NAME 'aVeryLongNameThatNobodyWouldLikeToWrite' SUP name )
    ( 1.2 NAME ( 'x' 'exact' ) EQUALITY caseExactMatch SYNTAX 1.3.6.1.4.1.1466.115.121.1.15 )
}
)";

}  // namespace

void fuzz_support::load_small_schema()
{
    ldcf_api_schema_init();
    ldcf_schema_g->parse_str(definitions, "small");
    ldcf_schema_g->complete_nocheck();
    expect(ldcf_api_schema_complete_db_names() == 0, "the schema has its names in the store");
    expect(ldcf_api_attr_get_info("commonName", nullptr) != nullptr, "the schema is in use");
}
