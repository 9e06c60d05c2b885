// Who uses a definition: see definition_users.h.
#include "tools/dirbase/definition_users.h"

#include <algorithm>

#include "tools/dirbase/definition_sheet.h"

namespace dirbase_tool {

namespace {

template <typename Map, typename Uses>
void collect_users(std::vector<std::string>& users, const Map& map, Uses&& uses)
{
    ldcf_for_each_definition(map, [&](const auto& definition) {
        if (uses(definition)) {
            users.push_back(std::string(ldcf_kind_of(definition)) + " '" + text_of(definition.name()) + "'");
        }
    });
}

std::vector<std::string> direct_users(const ldcf_syntax& syntax, const ldcf_schema& schema)
{
    std::vector<std::string> users;
    const auto uses = [&syntax](const auto& definition) { return definition->syntax() == syntax; };
    collect_users(users, schema.matching_rules, uses);
    collect_users(users, schema.attribute_types, uses);
    return users;
}

std::vector<std::string> direct_users(const ldcf_matchrule& rule, const ldcf_schema& schema)
{
    std::vector<std::string> users;
    collect_users(users, schema.attribute_types, [&rule](const ldcf_attrtype& attribute) {
        return attribute->equality_rule() == rule || attribute->ordering_rule() == rule ||
               attribute->substr_rule() == rule;
    });
    return users;
}

std::vector<std::string> direct_users(const ldcf_attrtype& attribute, const ldcf_schema& schema)
{
    std::vector<std::string> users;
    collect_users(users, schema.attribute_types,
                  [&attribute](const ldcf_attrtype& other) { return other->supertype() == attribute; });
    const auto named_in = [&](const ldcf_names& list) {
        return std::any_of(list.begin(), list.end(), [&](const csgl_string& name) {
            return ldcf_find(schema.attribute_types, name) == attribute;
        });
    };
    collect_users(users, schema.object_classes,
                  [&named_in](const ldcf_objclass& user) { return named_in(user->must()) || named_in(user->may()); });
    return users;
}

std::vector<std::string> direct_users(const ldcf_objclass& objclass, const ldcf_schema& schema)
{
    std::vector<std::string> users;
    collect_users(users, schema.object_classes,
                  [&objclass](const ldcf_objclass& user) { return user->superclasses().count(objclass) != 0; });
    return users;
}

template <typename T>
std::string note_of_users_in(const ldcf_map_name_to<T>& map, const T& definition, const ldcf_schema& schema)
{
    constexpr std::size_t shown = 10;
    const T found = ldcf_find(map, definition.oid());
    std::vector<std::string> users = found ? direct_users(found, schema) : std::vector<std::string>();
    if (users.empty()) {
        return "";
    }
    const std::size_t more = users.size() > shown ? users.size() - shown : 0;
    users.resize(users.size() - more);
    return "still used by " + joined(users) + (more == 0 ? "" : " and " + std::to_string(more) + " more");
}

}  // namespace

std::string note_of_users(const ldcf_syntax& definition, const ldcf_schema& schema)
{
    return note_of_users_in(schema.syntaxes, definition, schema);
}
std::string note_of_users(const ldcf_matchrule& definition, const ldcf_schema& schema)
{
    return note_of_users_in(schema.matching_rules, definition, schema);
}
std::string note_of_users(const ldcf_attrtype& definition, const ldcf_schema& schema)
{
    return note_of_users_in(schema.attribute_types, definition, schema);
}
std::string note_of_users(const ldcf_objclass& definition, const ldcf_schema& schema)
{
    return note_of_users_in(schema.object_classes, definition, schema);
}

}  // namespace dirbase_tool
