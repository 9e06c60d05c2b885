// dirbase schema diff: the first directory is the active schema, the second the proposed one, and the library tells how
// each class differs.
#include <algorithm>
#include <memory>
#include <new>

#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api_diff.h"
#include "tools/dirbase/describe_definition.h"
#include "tools/dirbase/schema_commands.h"
#include "tools/dirbase/schema_directory.h"

namespace dirbase_tool {

namespace {

const char* state_words(attr_diff_state state)
{
    switch (state) {
    case attr_diff_newly_must: return "newly MUST";
    case attr_diff_no_longer_must: return "no longer MUST";
    case attr_diff_newly_may: return "newly MAY";
    case attr_diff_no_longer_may: return "no longer MAY";
    case attr_diff_must_to_may: return "from MUST to MAY";
    case attr_diff_may_to_must: return "from MAY to MUST";
    case attr_diff_none: break;
    }
    return "unchanged";
}

// A definition's texts, one or two.
template <typename T>
std::vector<std::string> texts_of(const T& definition)
{
    std::vector<std::string> texts = {text_of(definition.v3_string())};
    if (!definition.xan_string().empty()) {
        texts.push_back(text_of(definition.xan_string()));
    }
    return texts;
}
// A class has no extended definition; its extended text form says no more than its oid.
std::vector<std::string> texts_of(const ldcf_objclass& objclass)
{
    return {text_of(objclass.v3_string())};
}

// The differences, gathered as lines and as JSON.
class difference_report {
public:
    difference_report(const ldcf_schema& before, const ldcf_schema& after) : before_(before), after_(after)
    {
        compare_definitions(before.syntaxes, after.syntaxes);
        compare_definitions(before.matching_rules, after.matching_rules);
        compare_definitions(before.attribute_types, after.attribute_types);
        compare_definitions(before.object_classes, after.object_classes);
    }

    bool found() const { return !text_.empty(); }
    const std::string& text() const { return text_; }
    const json& members() const { return members_; }

private:
    template <typename T>
    void compare_definitions(const ldcf_map_name_to<T>& before, const ldcf_map_name_to<T>& after)
    {
        ldcf_for_each_definition(before, [&](const T& was) {
            const T now = ldcf_find(after, was.oid());
            if (!now) {
                add(was, "gone", '-', texts_of(was));
            } else {
                compare(was, now);
            }
        });
        ldcf_for_each_definition(after, [&](const T& now) {
            if (!ldcf_find(before, now.oid())) {
                add(now, "new", '+', texts_of(now));
            }
        });
    }

    template <typename T>
    void compare(const T& was, const T& now)
    {
        if (texts_of(was) != texts_of(now)) {
            add_change(was, now);
        }
    }

    // A class may differ though its text doesn't: what it refers to may have changed.
    void compare(const ldcf_objclass& was, const ldcf_objclass& now)
    {
        const class_effects effects = effects_on(was, now);
        if (texts_of(was) == texts_of(now) && effects.lines.empty()) {
            return;
        }
        json& member = add_change(was, now);
        for (const std::string& line : effects.lines) {
            text_ += "  " + on_one_line(line) + "\n";
        }
        member.update(effects.members);
    }

    // Tells both texts, unless they are the same.
    template <typename T>
    json& add_change(const T& was, const T& now)
    {
        const std::vector<std::string> before = texts_of(was);
        const std::vector<std::string> after = texts_of(now);
        json& member = add(now, "changed", '-', before == after ? std::vector<std::string>() : before);
        add_texts('+', before == after ? std::vector<std::string>() : after);
        member["before"] = json_of_values(before);
        member["after"] = json_of_values(after);
        return member;
    }

    template <typename T>
    json& add(const T& definition, const char* what, char mark, const std::vector<std::string>& texts)
    {
        const std::string kind = ldcf_kind_of(definition);
        const std::string name = text_of(definition.name());
        text_ += on_one_line(kind + " " + name + ": " + what) + "\n";
        add_texts(mark, texts);
        members_.push_back({{"kind", kind},
                            {"name", json_of_value(name)},
                            {"oid", json_of_value(text_of(definition.oid()))},
                            {"difference", what}});
        return members_.back();
    }

    void add_texts(char mark, const std::vector<std::string>& texts)
    {
        for (const std::string& text : texts) {
            text_ += std::string("  ") + mark + " " + on_one_line(text) + "\n";
        }
    }

    // What the difference of a class comes to.
    struct class_effects {
        std::vector<std::string> lines;
        json members = json::object();
    };

    class_effects effects_on(const ldcf_objclass& was, const ldcf_objclass& now) const
    {
        class_effects effects;
        if (ldcf_api_compare_type(was) == 1) {
            const std::string from = kind_word(was->kind());
            const std::string to = kind_word(now->kind());
            effects.lines.push_back("kind: " + from + " to " + to);
            effects.members["classKind"] = {{"before", from}, {"after", to}};
        }
        if (ldcf_api_compare_SUP(was) == 1) {
            const std::vector<std::string> from = sorted_names(was->superclasses());
            const std::vector<std::string> to = sorted_names(now->superclasses());
            effects.lines.push_back("superiors: " + joined(from) + " to " + joined(to));
            effects.members["superclasses"] = {{"before", json_of_values(from)}, {"after", json_of_values(to)}};
        }
        json attributes = json::array();
        for (const auto& [oid, state] : attribute_changes(was)) {
            const std::string name = name_of(oid.c_str());
            effects.lines.push_back(std::string(state_words(state)) + ": " + name);
            attributes.push_back({{"attribute", json_of_value(name)}, {"change", state_words(state)}});
        }
        effects.members["attributes"] = std::move(attributes);
        return effects;
    }

    // The library's list, which runs against the order of oids, turned round.
    static std::vector<std::pair<std::string, attr_diff_state>> attribute_changes(const ldcf_objclass& objclass)
    {
        const std::unique_ptr<ldcf_diff_info, heap_free> info(ldcf_api_get_diff_info(objclass));
        if (info == nullptr) {
            throw std::bad_alloc();
        }
        std::vector<std::pair<std::string, attr_diff_state>> changes;
        for (const ldcf_diff_node* node = info->list; node != nullptr; node = node->next) {
            changes.emplace_back(node->oid, node->state);
        }
        ldcf_api_list_diff_info_delete(info->list);
        std::reverse(changes.begin(), changes.end());
        return changes;
    }

    std::string name_of(const char* oid) const
    {
        ldcf_attrtype type = ldcf_find(after_.attribute_types, oid);
        if (!type) {
            type = ldcf_find(before_.attribute_types, oid);
        }
        return text_of(type.name());
    }

    const ldcf_schema& before_;
    const ldcf_schema& after_;
    std::string text_;
    json members_ = json::array();
};

}  // namespace

int diff_schemas(const common_options& common, const std::string& before, const std::string& after)
{
    const schema_directory first(before, schema_directory::purpose::read);
    first.load();
    ldcf_schema proposed;
    {
        const schema_directory second(after, schema_directory::purpose::read);
        second.load_other(proposed, [](const std::string& path) { return path; });
    }
    ldcf_schema_proposed_g = &proposed;
    const difference_report report(*ldcf_schema_g, proposed);
    ldcf_schema_proposed_g = nullptr;

    if (common.as_json) {
        write_json(json{{"ok", !report.found()}, {"differences", report.members()}});
    } else {
        write_result(report.text());
    }
    return report.found() ? status_findings : status_yes;
}

}  // namespace dirbase_tool
