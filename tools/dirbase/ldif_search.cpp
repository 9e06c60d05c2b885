// dirbase ldif search
//
// One thread reads batches of whole entries and writes what matches, in the order of the file; others make the entries
// and test them (ldif_pool.h).
#include <strings.h>

#include <algorithm>
#include <map>
#include <memory>
#include <new>
#include <unordered_map>
#include <vector>

#include "libraries/libber/ldap_error.h"
#include "libraries/libber/ldap_result.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/base/server_globals.h"
#include "servers/vrnd/libdirbase/model/attribute.h"
#include "servers/vrnd/libdirbase/model/dn_esc.h"
#include "servers/vrnd/libdirbase/model/dn_suffix.h"
#include "servers/vrnd/libdirbase/model/filter_evaluation.h"
#include "servers/vrnd/libdirbase/model/language_tag.h"
#include "tools/dirbase/current_failure.h"
#include "tools/dirbase/data_commands.h"
#include "tools/dirbase/filter_text.h"
#include "tools/dirbase/ldif_commands.h"
#include "tools/dirbase/ldif_pool.h"
#include "tools/dirbase/progress.h"
#include "tools/dirbase/text_file.h"

namespace dirbase_tool {

namespace {

// ---- what is searched, and what is printed --------------------------------------------------------------------------

// The part of the tree that is searched (RFC 4511 section 4.5.1.2).
class search_area {
public:
    search_area(const std::optional<std::string>& base, search_scope scope) : scope_(scope)
    {
        if (!base) {
            return;
        }
        ldap_escDN* parsed = dn_normalize_esc(base->c_str());
        if (parsed == nullptr) {
            throw std::bad_alloc();
        }
        const std::unique_ptr<ldap_escDN, void (*)(ldap_escDN*)> owner(parsed,
                                                                       [](ldap_escDN* dn) { free_ldap_escDN(&dn); });
        if (parsed->result != LDAP_SUCCESS) {
            throw tool_failure(status_unusable, "", 0, "the base is refused: " + refusal_of_dn(*base));
        }
        base_ = GetDNUpper33(parsed);
    }

    bool holds(const char* normal_dn) const
    {
        if (scope_ == search_scope::sub) {
            return base_.empty() || dn_issuffix_norm(normal_dn, base_.c_str());
        }
        if (scope_ == search_scope::base) {
            return base_ == normal_dn;
        }
        char* parent = nullptr;
        dn_get_parent_norm(nullptr, normal_dn, &parent, 0);
        return base_ == (parent == nullptr ? "" : parent);
    }

private:
    std::string base_;  // in normal form; empty for the root
    search_scope scope_;
};

// An attribute by its name: what the schema knows of it, and the language tag.
struct attribute_name {
    std::string base;
    std::string tag;
    const asyntaxinfo* info;

    explicit attribute_name(const char* name)
    {
        char* parts[2] = {};
        // A tag that is too long is part of a name that nobody knows.
        if (parse_language_tags(name, &parts[0], &parts[1], LANGUAGE_BASE_AND_TAG, 1) == LDAP_NO_MEMORY) {
            throw std::bad_alloc();
        }
        const heap_text owners[] = {heap_text(parts[0]), heap_text(parts[1])};
        base = parts[0] == nullptr ? name : parts[0];
        tag = parts[1] == nullptr ? "" : parts[1];
        info = ldcf_api_attr_get_info(base.c_str(), nullptr);
    }

    // Whether the other is this attribute, in this version when this one has a tag.
    bool stands_for(const attribute_name& other) const
    {
        const bool same = info != nullptr || other.info != nullptr
                              ? info == other.info
                              : ::strcasecmp(base.c_str(), other.base.c_str()) == 0;
        return same && (tag.empty() || strtagcmp(tag.c_str(), other.tag.c_str()) == 0);
    }
};

// Which attributes are printed (RFC 4511 section 4.5.1.8).
class attribute_selection {
public:
    explicit attribute_selection(const std::vector<std::string>& names)
    {
        all_ = names.empty();
        for (const std::string& name : names) {
            if (name == "*") {
                all_ = true;
            } else if (name != "1.1") {  // which is there to have no other
                wanted_.emplace_back(name.c_str());
            }
        }
    }

    bool takes(const char* type)
    {
        if (all_) {
            return true;
        }
        if (const auto found = known_.find(type); found != known_.end()) {
            return found->second;
        }
        if (known_.size() >= most_known) {
            known_.clear();
        }
        const attribute_name name(type);
        const bool taken = std::any_of(wanted_.begin(), wanted_.end(),
                                       [&name](const attribute_name& wanted) { return wanted.stands_for(name); });
        known_.emplace(type, taken);
        return taken;
    }

    // Says which of them no entry can have.
    void tell_unknown() const
    {
        for (const attribute_name& name : wanted_) {
            if (name.info == nullptr) {
                tell("note: the schema has no attribute " + quoted(std::string_view(name.base)));
            }
        }
    }

private:
    static constexpr std::size_t most_known = 1000;

    bool all_;
    std::vector<attribute_name> wanted_;
    std::unordered_map<std::string, bool> known_;
};

// ---- testing --------------------------------------------------------------------------------------------------------

struct search_settings {
    const Filter* filter;
    search_area area;
    attribute_selection selection;
    std::string source;
    bool as_json;
    bool count_only;
};

// Something about an entry that doesn't match.
struct remark {
    std::size_t before;  // the number of matches in front of it in its batch
    int result;          // of an evaluation that failed; LDAP_SUCCESS for an entry that can't be read
    std::string line;    // what is told of that
};

// A batch and what came of it.
struct work {
    ldif_batch batch;
    std::string text;               // the entries that match, a character in front of each that parts it from another
    std::vector<std::size_t> ends;  // where in the text each ends
    std::vector<remark> remarks;
    std::size_t entries = 0;
};

// Searches batches, one at a time; each thread has its own.
class batch_searcher {
public:
    explicit batch_searcher(const search_settings& settings) : settings_(settings), selection_(settings.selection) {}

    void operator()(work& item);

private:
    void search(work& item, const ldif_entry_text& text);
    entry_pointer read(const ldif_entry_text& text);
    void write(const Entry& entry, std::string& text);

    const search_settings& settings_;
    attribute_selection selection_;
    ldif_text text_;
    ldif_fault_list faults_;
};

void batch_searcher::operator()(work& item)
{
    item.text.clear();
    item.ends.clear();
    item.remarks.clear();
    item.entries = 0;
    const schema_reader guard;
    ldif_entry_text entry;
    for (std::size_t told = 0; item.text.size() + told < results_limit && take_entry(item.batch, entry);) {
        faults_.clear();
        search(item, entry);
        for (std::string& line : lines_of(faults_, text_, settings_.source, "; the entry is passed over")) {
            told += line.size();
            item.remarks.push_back({item.ends.size(), LDAP_SUCCESS, std::move(line)});
        }
    }
}

void batch_searcher::search(work& item, const ldif_entry_text& text)
{
    const entry_pointer entry = read(text);
    if (entry == nullptr) {
        return;
    }
    ++item.entries;
    const int result = test_filter(entry.get(), settings_.filter);
    if (result == FILTER_TRUE) {
        if (!settings_.count_only) {
            write(*entry, item.text);
        }
        item.ends.push_back(item.text.size());
    } else if (result == LDAP_NO_MEMORY) {
        throw std::bad_alloc();
    } else if (result > 0) {
        item.remarks.push_back({item.ends.size(), result, ""});
    }
}

// The entry of a text; null, perhaps with faults, for what isn't to be tested.
entry_pointer batch_searcher::read(const ldif_entry_text& text)
{
    if (text_.parse(text, faults_) != ldif_text::content::entry || !faults_.empty()) {
        return nullptr;
    }
    entry_pointer entry = new_entry(text_, faults_);
    if (entry->e_norm_dn == nullptr || !settings_.area.holds(entry->e_norm_dn)) {
        return nullptr;
    }
    return add_values(*entry, text_, false, faults_) ? std::move(entry) : nullptr;
}

void batch_searcher::write(const Entry& entry, std::string& text)
{
    if (!settings_.as_json) {
        text += '\n';
        append_ldif_line(text, "dn", entry.e_dn);
        for (const ldif_line& line : text_.lines()) {
            if (selection_.takes(line.type)) {
                append_ldif_line(text, line.type, {line.value, line.length});
            }
        }
        return;
    }
    json attributes = json::object();
    for (const Attribute* attribute = entry.e_attrs; attribute != nullptr; attribute = attribute->a_next) {
        if (selection_.takes(attribute->a_type)) {
            json& values = attributes[attribute->a_type] = json::array();
            for (std::int64_t i = 0; i < attribute->a_numvals; ++i) {
                values.push_back(json_of_value({attribute->a_vals[i]->bv_val, attribute->a_vals[i]->bv_len}));
            }
        }
    }
    const json member = {{"dn", json_of_value(entry.e_dn)}, {"attributes", std::move(attributes)}};
    text += ",\n    " + member.dump(-1, ' ', false, json::error_handler_t::replace);
}

// ---- results --------------------------------------------------------------------------------------------------------

// What a failure to evaluate comes from.
std::string words_of_failure(int result)
{
    std::string words = ldap_err2string(result);
    switch (result) {
    case LDAP_OPERATIONS_ERROR: return words + " (most likely the pieces of a substring filter, which are too long)";
    case LDAP_FILTER_ERROR: return words + " (the attribute's syntax lacks the comparison)";
    case LDAP_NOT_SUPPORTED: return words + " (values that are bytes aren't compared)";
    default: return words;
    }
}

// Takes the searched batches in their order: writes and counts.
class search_results {
public:
    // undefined: what is said about elements of the filter that are undefined.
    search_results(const search_settings& settings, const ldif_reader& reader, std::size_t limit,
                   std::vector<std::string> undefined)
        : settings_(settings), reader_(reader), limit_(limit), undefined_(std::move(undefined))
    {
    }

    bool take(const work& item);
    void finish(const tool_failure* failure);
    int status() const { return found_any() ? status_yes : status_findings; }

private:
    bool found_any() const { return matches_ != 0; }
    void show_progress();

    const search_settings& settings_;
    const ldif_reader& reader_;
    std::size_t limit_;
    std::vector<std::string> undefined_;
    std::size_t entries_ = 0;
    std::size_t matches_ = 0;
    std::map<int, std::size_t> failures_;  // by their results
    progress progress_;
};

// False when there have been as many matches as are wanted.
bool search_results::take(const work& item)
{
    const std::size_t room = limit_ == 0 ? item.ends.size() + 1 : limit_ - matches_;
    const std::size_t taken = std::min(item.ends.size(), room);
    for (const remark& about : item.remarks) {
        if (about.before >= room) {
            break;
        }
        if (about.result != LDAP_SUCCESS) {
            ++failures_[about.result];
        } else {
            progress_.clear();
            tell(about.line);
        }
    }
    if (taken != 0 && !settings_.count_only) {
        progress_.clear();
        const std::string_view text = std::string_view(item.text).substr(0, item.ends[taken - 1]);
        const bool first = matches_ == 0;
        write_result(std::string(first && settings_.as_json ? "{\n  \"entries\": [" : "").append(text, first ? 1 : 0));
    }
    entries_ += item.entries;
    matches_ += taken;
    show_progress();
    return limit_ == 0 || matches_ < limit_;
}

void search_results::show_progress()
{
    if (progress_.is_due()) {
        std::string line = std::to_string(entries_) + " entries tested, " + std::to_string(matches_) + " match";
        if (reader_.bytes_in_all() != 0) {
            line += ", " + std::to_string(100 * reader_.bytes_read() / reader_.bytes_in_all()) + "% read";
        }
        progress_.show(line);
    }
}

// Writes what comes last; with a failure that ended the work ahead of its time.
void search_results::finish(const tool_failure* failure)
{
    progress_.clear();
    for (const auto& [result, count] : failures_) {
        tell(std::to_string(count) + (count == 1 ? " entry" : " entries") +
             ": the filter can't be evaluated: " + words_of_failure(result));
    }
    if (!settings_.as_json) {
        write_result(settings_.count_only && failure == nullptr ? std::to_string(matches_) + "\n" : "");
        return;
    }
    json rest = {{"count", matches_}};
    if (!undefined_.empty()) {
        rest["undefined"] = undefined_;
    }
    for (const auto& [result, count] : failures_) {
        rest["unevaluated"].push_back({{"entries", count}, {"result", result}, {"text", ldap_err2string(result)}});
    }
    rest["ok"] = failure == nullptr && found_any();
    if (failure != nullptr) {
        rest["error"] = json_of(*failure);
    }
    const std::string text = rest.dump(2, ' ', false, json::error_handler_t::replace) + "\n";
    const char* const entries = settings_.count_only ? "{\n" : found_any() ? "\n  ],\n" : "{\n  \"entries\": [],\n";
    write_result(entries + text.substr(2));
}

const filter_element* first_refused(const filter_element& element)
{
    if (element.verdict == filter_verdict::refused) {
        return &element;
    }
    for (const filter_element& child : element.elements) {
        if (const filter_element* const found = first_refused(child); found != nullptr) {
            return found;
        }
    }
    return nullptr;
}

// Raises what a search can't be made with, and says what is undefined.
void tell_of_filter(const parsed_filter& filter)
{
    switch (filter.verdict()) {
    case filter_verdict::no_filter:
        throw tool_failure(status_unusable, "", 0,
                           "no filter: at byte " + std::to_string(filter.offset()) + ": " + filter.fault());
    case filter_verdict::refused: {
        const filter_element* const element = first_refused(filter.root());
        throw tool_failure(status_unusable, "", 0, "the filter is refused: " + filter.fault(),
                           element == nullptr ? "" : "the element is: " + element->label());
    }
    case filter_verdict::undefined: tell("the filter is undefined, so no entry matches it"); break;
    case filter_verdict::defined: break;
    }
    for (const std::string& remark : filter.remarks()) {
        tell("note: " + remark);
    }
}

}  // namespace

int search_ldif(const common_options& common, const ldif_search_call& call)
{
    set_g_language_tags_enabled(1);
    load_for_entries(common);
    ldif_reader reader(call.file, false);
    std::optional<parsed_filter> filter;
    std::optional<search_settings> settings;
    {
        const schema_reader guard;
        filter.emplace(call.filter);
        tell_of_filter(*filter);
        settings.emplace(search_settings{filter->filter(), search_area(call.base, call.scope),
                                         attribute_selection(call.attributes), source_name(call.file), common.as_json,
                                         call.count_only});
        settings->selection.tell_unknown();
    }
    search_results out(*settings, reader, call.limit, filter->remarks(true));
    return write_results(common.as_json, out, [&] {
        if (settings->filter != nullptr) {
            for_each_batch<work>(
                reader, ldif_threads(call.threads), [&settings] { return batch_searcher(*settings); },
                [&out](const work& item) { return out.take(item); });
        }
    });
}

}  // namespace dirbase_tool
