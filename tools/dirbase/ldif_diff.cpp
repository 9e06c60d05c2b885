// dirbase ldif diff
//
// Both files are held as entries, found by their normal DN. The changes come in an order in which a server takes them:
// entries that go, leaves first; entries that change; entries that come, parents first.
#include <algorithm>
#include <memory>
#include <new>
#include <set>
#include <unordered_map>
#include <unordered_set>

#include <strings.h>

#include "libraries/libber/ldap_result.h"
#include "servers/vrnd/libdirbase/base/syntax_codes.h"
#include "servers/vrnd/libdirbase/model/attr_value_tree.h"
#include "servers/vrnd/libdirbase/model/attribute.h"
#include "servers/vrnd/libdirbase/model/language_tag.h"
#include "servers/vrnd/libdirbase/model/value_compare.h"
#include "tools/dirbase/current_failure.h"
#include "tools/dirbase/ldif_commands.h"
#include "tools/dirbase/ldif_reader.h"
#include "tools/dirbase/text_file.h"

namespace dirbase_tool {

namespace {

std::string_view bytes_of(const berval& value)
{
    return {value.bv_val, value.bv_len};
}

// The entries of one file, in its order.
class ldif_side {
public:
    explicit ldif_side(const std::string& file);

    const std::vector<entry_pointer>& entries() const { return entries_; }
    const Entry* find(std::string_view normal_dn) const
    {
        const auto found = by_dn_.find(normal_dn);
        return found == by_dn_.end() ? nullptr : found->second;
    }
    bool is_whole() const { return whole_; }

private:
    void take(const ldif_entry_text& entry, const std::string& source);

    std::vector<entry_pointer> entries_;
    std::unordered_map<std::string_view, const Entry*> by_dn_;
    ldif_text text_;
    bool whole_ = true;
};

ldif_side::ldif_side(const std::string& file)
{
    ldif_reader reader(file, false);
    for (ldif_batch batch; reader.next(batch);) {
        const schema_reader guard;
        for (ldif_entry_text entry; take_entry(batch, entry);) {
            take(entry, source_name(file));
        }
    }
}

void ldif_side::take(const ldif_entry_text& entry, const std::string& source)
{
    ldif_fault_list faults;
    entry_pointer made;
    if (text_.parse(entry, faults) == ldif_text::content::entry && faults.empty()) {
        made = make_entry(text_, true, faults);
    }
    if (made != nullptr && !by_dn_.emplace(made->e_norm_dn, made.get()).second) {
        faults.add(ldif_fault_kind::second_dn, text_.line(), "", "the file has this entry already");
    }
    for (const std::string& line : lines_of(faults, text_, source)) {
        tell(line);
        whole_ = false;
    }
    if (made != nullptr && faults.empty()) {
        entries_.push_back(std::move(made));
    }
}

// What the schema says about an attribute that matters here, looked up once.
class attribute_rules {
public:
    struct rule {
        bool modifiable = true;
        bool single_value = false;
        bool has_equality = true;
    };

    const rule& of(const asyntaxinfo* info)
    {
        const auto [place, added] = rules_.try_emplace(info);
        if (added && info != nullptr) {
            const auto& types = ldcf_schema_g->attribute_types;
            if (const auto found = types.find(csgl_string(info->names[0])); found != types.end()) {
                place->second = {found->second->user_modifiable(), found->second->single_value(),
                                 found->second->equality().length() != 0};
            }
        }
        return place->second;
    }

private:
    std::unordered_map<const asyntaxinfo*, rule> rules_;
};

// The record of the same version of an attribute in another entry; null when there is none.
const Attribute* counterpart(const Attribute& attribute, const Entry& other)
{
    if (attribute.a_info != nullptr) {
        char tag[language_tag_buffer] = "";
        parse_language_tags_with_buffer(attribute.a_type, nullptr, tag, nullptr, LANGUAGE_TAG);
        return flatattr_find(&other, attribute.a_info, tag);
    }
    for (const Attribute* at = other.e_attrs; at != nullptr; at = at->a_next) {
        if (at->a_info == nullptr && ::strcasecmp(at->a_type, attribute.a_type) == 0) {
            return at;
        }
    }
    return nullptr;
}

// Whether the values of an attribute are compared as bytes. They are found one by one nowhere: neither here in a value
// tree nor by a server, unless the attribute has an equality rule.
bool holds_bytes(const Attribute& attribute)
{
    return static_cast<unsigned>(attribute.a_syntax) == SC_BIN;
}

std::vector<const berval*> all_values(const Attribute& attribute)
{
    return {attribute.a_vals, attribute.a_vals + attribute.a_numvals};
}

// Finds values of an attribute, however many there are: by their syntax, and those that it refuses by their bytes. An
// attribute's value tree is used where it has one; it has none when a value was refused, or is encrypted.
class value_index {
public:
    explicit value_index(const Attribute& attribute)
        : attribute_(attribute), has_tree_(attribute.a_tree != nullptr && !holds_bytes(attribute))
    {
        for (std::int64_t i = 0; i < attribute.a_numvals && !has_tree_; ++i) {
            const berval& value = *attribute.a_vals[i];
            bytes_.insert(bytes_of(value));
            if (node_pointer node = node_of(value); node != nullptr) {
                nodes_.insert(std::move(node));
            }
        }
    }

    bool has(const berval& value) const
    {
        if (has_tree_) {
            return value_find(&attribute_, &value, static_cast<std::uint32_t>(attribute_.a_syntax), 1) == 0;
        }
        if (bytes_.contains(bytes_of(value))) {
            return true;
        }
        const node_pointer node = node_of(value);
        return node != nullptr && nodes_.contains(node);
    }

private:
    struct free_node {
        void operator()(AttrvalsNorm* node) const noexcept { free_AttrvalsNorm(node); }
    };
    using node_pointer = std::unique_ptr<AttrvalsNorm, free_node>;
    struct order {
        bool operator()(const node_pointer& a, const node_pointer& b) const
        {
            return value_cmp_fast(a.get(), b.get()) < 0;
        }
    };

    // Null for a value that the syntax refuses, and for bytes.
    node_pointer node_of(const berval& value) const
    {
        AttrvalsNorm* made = nullptr;
        if (holds_bytes(attribute_)) {
            return nullptr;
        }
        const auto syntax = static_cast<std::uint32_t>(attribute_.a_syntax);
        if (create_normalized_berval_in_attrvalsNorm(&made, &value, syntax, 1) == LDAP_NO_MEMORY) {
            throw std::bad_alloc();
        }
        return node_pointer(made);
    }

    const Attribute& attribute_;
    bool has_tree_;
    std::unordered_set<std::string_view> bytes_;
    std::set<node_pointer, order> nodes_;
};

// The values of one attribute that another lacks.
std::vector<const berval*> values_missing(const Attribute& from, const Attribute& in)
{
    const value_index index(in);
    std::vector<const berval*> missing = all_values(from);
    std::erase_if(missing, [&index](const berval* value) { return index.has(*value); });
    return missing;
}

void append_modification(std::string& text, const char* operation, const Attribute& attribute,
                         const std::vector<const berval*>& values)
{
    append_ldif_line(text, operation, attribute.a_type);
    for (const berval* value : values) {
        append_ldif_line(text, attribute.a_type, bytes_of(*value));
    }
    text += "-\n";
}

// The modifications that turn one entry into the other, which has the same DN; empty when they are equal.
std::string modifications(const Entry& before, const Entry& after, attribute_rules& rules)
{
    std::string text;
    for (const Attribute* old = before.e_attrs; old != nullptr; old = old->a_next) {
        if (!rules.of(old->a_info).modifiable || old->a_numvals == 0) {
            continue;
        }
        const Attribute* const now = counterpart(*old, after);
        if (now == nullptr || now->a_numvals == 0) {
            append_modification(text, "delete", *old, {});
            continue;
        }
        const std::vector<const berval*> gone = values_missing(*old, *now);
        const std::vector<const berval*> come = values_missing(*now, *old);
        if (gone.empty() && come.empty()) {
            continue;
        }
        // A server finds a value to delete by the equality rule. Without one, and where that is shorter, all values are
        // replaced.
        const attribute_rules::rule& rule = rules.of(old->a_info);
        const bool replace = !gone.empty() && (!rule.has_equality || rule.single_value ||
                                               gone.size() + come.size() >= static_cast<std::size_t>(now->a_numvals));
        if (replace) {
            append_modification(text, "replace", *now, all_values(*now));
            continue;
        }
        if (!gone.empty()) {
            append_modification(text, "delete", *old, gone);
        }
        if (!come.empty()) {
            append_modification(text, "add", *now, come);
        }
    }
    for (const Attribute* now = after.e_attrs; now != nullptr; now = now->a_next) {
        const Attribute* const old = counterpart(*now, before);
        if (rules.of(now->a_info).modifiable && now->a_numvals != 0 && (old == nullptr || old->a_numvals == 0)) {
            append_modification(text, "add", *now, all_values(*now));
        }
    }
    return text;
}

std::string all_lines(const Entry& entry, attribute_rules& rules)
{
    std::string text;
    for (const Attribute* attribute = entry.e_attrs; attribute != nullptr; attribute = attribute->a_next) {
        if (rules.of(attribute->a_info).modifiable) {
            for (const berval* value : all_values(*attribute)) {
                append_ldif_line(text, attribute->a_type, bytes_of(*value));
            }
        }
    }
    return text;
}

// The part of a normal DN behind its first RDN; empty for the last one.
std::string_view parent_of(std::string_view dn)
{
    for (std::size_t at = 0; at < dn.size(); ++at) {
        if (dn[at] == '\\') {
            ++at;
        } else if (dn[at] == ',') {
            return dn.substr(at + 1);
        }
    }
    return {};
}

std::size_t depth_of(const Entry* entry)
{
    std::size_t depth = 0;
    for (std::string_view dn = entry->e_norm_dn; !dn.empty(); dn = parent_of(dn)) {
        ++depth;
    }
    return depth;
}

// Writes change records.
class change_writer {
public:
    explicit change_writer(bool as_json) : as_json_(as_json) {}

    void write(const Entry& entry, const char* type, const std::string& body);
    void finish(const tool_failure* failure);
    int status() const { return begun_ ? status_findings : status_yes; }

private:
    bool as_json_;
    bool begun_ = false;
    std::unordered_map<std::string_view, std::size_t> counts_;  // by the types
};

void change_writer::write(const Entry& entry, const char* type, const std::string& body)
{
    std::string text;
    append_ldif_line(text, "dn", entry.e_dn);
    append_ldif_line(text, "changetype", type);
    text += body;
    if (as_json_) {
        const json change = {{"dn", entry.e_dn}, {"changetype", type}, {"ldif", text}};
        text = (begun_ ? ",\n    " : "{\n  \"changes\": [\n    ") +
               change.dump(-1, ' ', false, json::error_handler_t::replace);
    } else {
        text.insert(0, begun_ ? "\n" : "version: 1\n\n");
    }
    begun_ = true;
    ++counts_[type];
    write_result(text);
}

void change_writer::finish(const tool_failure* failure)
{
    if (as_json_) {
        json rest = {{"deleted", counts_["delete"]},
                     {"modified", counts_["modify"]},
                     {"added", counts_["add"]},
                     {"same", failure == nullptr && !begun_},
                     {"ok", failure == nullptr && !begun_}};
        if (failure != nullptr) {
            rest["error"] = json_of(*failure);
        }
        write_result((begun_ ? "\n  ],\n" : "{\n  \"changes\": [],\n") + rest.dump(2).substr(2) + "\n");
    }
}

// Tells of entries that go while others below them stay: no order makes a server take that.
void tell_orphans(const ldif_side& before, const ldif_side& after)
{
    for (const entry_pointer& entry : after.entries()) {
        const std::string_view parent = parent_of(entry->e_norm_dn);
        if (before.find(parent) != nullptr && after.find(parent) == nullptr) {
            tell("note: " + std::string(entry->e_dn) + " stays, and its parent goes; a server may refuse that");
        }
    }
}

// Writes the changes in their order.
void write_changes(const ldif_side& before, const ldif_side& after, change_writer& out)
{
    const schema_reader guard;
    attribute_rules rules;
    std::vector<const Entry*> going;
    std::vector<const Entry*> coming;
    for (const entry_pointer& entry : before.entries()) {
        if (after.find(entry->e_norm_dn) == nullptr) {
            going.push_back(entry.get());
        }
    }
    for (const entry_pointer& entry : after.entries()) {
        if (before.find(entry->e_norm_dn) == nullptr) {
            coming.push_back(entry.get());
        }
    }
    std::stable_sort(going.begin(), going.end(),
                     [](const Entry* a, const Entry* b) { return depth_of(a) > depth_of(b); });
    std::stable_sort(coming.begin(), coming.end(),
                     [](const Entry* a, const Entry* b) { return depth_of(a) < depth_of(b); });
    for (const Entry* entry : going) {
        out.write(*entry, "delete", "");
    }
    for (const entry_pointer& entry : before.entries()) {
        if (const Entry* const now = after.find(entry->e_norm_dn); now != nullptr) {
            if (const std::string changes = modifications(*entry, *now, rules); !changes.empty()) {
                out.write(*entry, "modify", changes);
            }
        }
    }
    for (const Entry* entry : coming) {
        out.write(*entry, "add", all_lines(*entry, rules));
    }
}

}  // namespace

int diff_ldif(const common_options& common, const std::string& before_file, const std::string& after_file)
{
    load_for_entries(common);
    if (before_file == standard_input && after_file == standard_input) {
        throw tool_failure(status_unusable, "", 0, "only one of the files can be standard input");
    }
    const ldif_side before(before_file);
    const ldif_side after(after_file);
    if (!before.is_whole() || !after.is_whole()) {
        throw tool_failure(status_unusable, "", 0, "what isn't whole can't be compared");
    }
    change_writer out(common.as_json);
    return write_results(common.as_json, out, [&] {
        write_changes(before, after, out);
        tell_orphans(before, after);
    });
}

}  // namespace dirbase_tool
