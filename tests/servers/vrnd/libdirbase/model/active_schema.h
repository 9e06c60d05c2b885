// The shipped schema as the active one, with an attribute type whose OID is much shorter than its name.
#pragma once

#include "servers/vrnd/libdirbase/schema/ldcf_api.h"
#include "tests/servers/vrnd/libdirbase/schema/schema_fixture.h"

namespace model_test {

constexpr char long_name[] = "a-name-that-takes-much-more-room-than-the-number-it-is-written-by";

inline void unload_active_schema()
{
    ldcf_hash_flush();
    ldcf_schema_g->clear();
}

// Loads the schema in place of what there is.
inline void load_active_schema()
{
    const schema_test::relational_store store;
    unload_active_schema();
    ldcf_api_schema_init();
    schema_test::load_shipped(*ldcf_schema_g);
    const std::string text = std::string("attributeTypes { ( 1.1 NAME '") + long_name + "' SUP name ) }";
    ldcf_schema_g->parse_str(text.c_str(), "test");
    ASSERT_EQ(ldcf_api_schema_complete(), 0);
    ASSERT_EQ(ldcf_api_schema_complete_db_names(), 0);
}

// The base of test suites that need it.
class with_active_schema : public testing::Test {
protected:
    static void SetUpTestSuite() { load_active_schema(); }
    static void TearDownTestSuite() { unload_active_schema(); }
};

}  // namespace model_test
