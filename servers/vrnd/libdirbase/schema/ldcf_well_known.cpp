// The attributes that the rest of the server finds by number, and the class of every attribute.
#include <algorithm>
#include <iterator>

#include "servers/vrnd/libdirbase/schema/ldcf_attrtype.h"

namespace {

struct well_known {
    const char* name;  // in lower case
    ldcf_attr_identity identity;
};

constexpr int attr_class_operational = 1;

// Sorted by name.
constexpr well_known attributes[] = {
    {"aclentry", {-16, 3}},
    {"aclpropagate", {-2, 3}},
    {"aclsource", {-9, 3}},
    {"aliasedentryname", {-1, 4}},
    {"aliasedobjectname", {-1, 4}},
    {"changes", {-23, 9}},
    {"cn", {-13, 9}},
    {"createtimestamp", {8, 5}},
    {"creatorsname", {6, 5}},
    {"entryowner", {-17, 3}},
    {"hassubordinates", {3, 5}},
    {"member", {0, 9}},
    {"modifiersname", {7, 5}},
    {"modifytimestamp", {9, 5}},
    {"numsubordinates", {24, 5}},
    {"objectclass", {-6, 9}},
    {"ownerpropagate", {-3, 3}},
    {"ownersource", {-10, 3}},
    {"pwdaccountlockedtime", {12, 7}},
    {"pwdchangedtime", {11, 7}},
    {"pwdexpirationwarned", {13, 7}},
    {"pwdfailuretime", {14, 7}},
    {"pwdgraceusetime", {16, 7}},
    {"pwdhistory", {15, 7}},
    {"pwdreset", {17, 7}},
    {"ref", {-15, 9}},
    {"replicacredentials", {-21, 1}},
    {"secretkey", {23, 9}},
    {"subschemasubentry", {10, 1}},
    {"subtreespecification", {-1, 1}},
    {"uniquemember", {1, 9}},
    {"userpassword", {22, 9}},
    {"xan-allgroups", {-8, 8}},
    {"xan-allmembers", {-7, 8}},
    {"xan-capabilitiessubentry", {18, 1}},
    {"xan-effectiveacl", {-18, 3}},
    {"xan-enabledcapabilities", {-11, 1}},
    {"xan-entrychecksum", {4, 5}},
    {"xan-entrychecksumop", {5, 5}},
    {"xan-entryuuid", {2, 5}},
    {"xan-filteraclentry", {-5, 3}},
    {"xan-filteraclinherit", {-4, 3}},
    {"xan-membergroup", {-14, 9}},
    {"xan-pwdaccountlocked", {25, 7}},
    {"xan-pwdgrouppolicydn", {27, 7}},
    {"xan-pwdindividualpolicydn", {28, 7}},
    {"xan-replicakeypwd", {-22, 9}},
    {"xan-replicationchangeldif", {-1, 6}},
    {"xan-replicationisquiesced", {21, 6}},
    {"xan-replicationlastactivationtime", {-1, 6}},
    {"xan-replicationlastchangeid", {-1, 6}},
    {"xan-replicationlastfinishtime", {-1, 6}},
    {"xan-replicationlastglobalchangeid", {-1, 6}},
    {"xan-replicationlastresult", {-1, 6}},
    {"xan-replicationlastresultadditional", {-1, 6}},
    {"xan-replicationnexttime", {-1, 6}},
    {"xan-replicationpendingchangecount", {-1, 6}},
    {"xan-replicationpendingchanges", {-1, 6}},
    {"xan-replicationstate", {-1, 6}},
    {"xan-replicationthisserverismaster", {20, 6}},
    {"xan-supportedcapabilities", {-12, 1}},
    {"xan-vrndcryptosalt", {-20, 10}},
    {"xan-vrndcryptosync", {-19, 10}},
};

// The look-up is a binary search, so the order above is part of the table.
constexpr bool sorted_by_name()
{
    for (std::size_t i = 1; i < std::size(attributes); ++i) {
        const char* a = attributes[i - 1].name;
        const char* b = attributes[i].name;
        while (*a == *b && *a != '\0') {
            ++a;
            ++b;
        }
        if (*a >= *b) {
            return false;
        }
    }
    return true;
}
static_assert(sorted_by_name());

constexpr char configuration_file[] = "V3.config.at";

}  // namespace

ldcf_attr_identity ldcf_identify_attribute(const csgl_string& v3_file, const csgl_string& name, ldcf_usage usage)
{
    const char* base_name = v3_file.c_str() + (v3_file.rfind('/') + 1);
    if (csgl_str_ci_compare(base_name, configuration_file) == 0) {
        return {-1, ldcf_attr_class_configuration};
    }
    const auto* found = std::lower_bound(
        std::begin(attributes), std::end(attributes), name,
        [](const well_known& known, const char* text) { return csgl_str_ci_compare(known.name, text) < 0; });
    if (found != std::end(attributes) && csgl_str_ci_compare(found->name, name) == 0) {
        return found->identity;
    }
    return {-1, usage == ldcf_usage::user_applications ? ldcf_attr_class_user : attr_class_operational};
}
