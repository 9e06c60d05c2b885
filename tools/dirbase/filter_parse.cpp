// dirbase filter parse
#include "servers/vrnd/libdirbase/base/server_globals.h"
#include "tools/dirbase/answers.h"
#include "tools/dirbase/filter_commands.h"
#include "tools/dirbase/filter_text.h"
#include "tools/dirbase/ldif_entry.h"
#include "tools/dirbase/schema_directory.h"

namespace dirbase_tool {

namespace {

const char* word_of(filter_verdict verdict)
{
    switch (verdict) {
    case filter_verdict::defined: return "defined";
    case filter_verdict::undefined: return "undefined";
    case filter_verdict::refused: return "refused";
    case filter_verdict::no_filter: return "no filter";
    }
    return "";
}

// An element a line, each below what it belongs to.
void draw(const filter_element& element, std::size_t indent, std::string& text)
{
    text += std::string(indent, ' ');
    const bool is_list = filter_has_list(element.choice) && element.reason.empty();
    if (element.verdict == filter_verdict::defined || is_list) {
        text += element.label() + (element.remark.empty() ? "" : " (" + element.remark + ")") + "\n";
    } else {
        text +=
            std::string(word_of(element.verdict)) + ": " + element.label() + " (" + on_one_line(element.reason) + ")\n";
    }
    for (const filter_element& child : element.elements) {
        draw(child, indent + 2, text);
    }
}

std::string text_of(const parsed_filter& filter)
{
    std::string text;
    switch (filter.verdict()) {
    case filter_verdict::defined: text = shown(filter.canonical()) + "\n"; break;
    case filter_verdict::undefined: text = "undefined  no entry matches it\n"; break;
    case filter_verdict::refused: text = "refused    " + on_one_line(filter.fault()) + "\n"; break;
    case filter_verdict::no_filter:
        return "no filter  at byte " + std::to_string(filter.offset()) + ": " + on_one_line(filter.fault()) + "\n";
    }
    draw(filter.root(), 2, text);
    return text;
}

json json_of(const std::string& given, const parsed_filter& filter)
{
    json member = {{"filter", json_of_value(given)}, {"verdict", word_of(filter.verdict())}};
    if (filter.verdict() == filter_verdict::defined) {
        member["text"] = filter.canonical();
    }
    if (!filter.fault().empty()) {
        member["error"] = {{"text", filter.fault()}};
    }
    if (filter.verdict() == filter_verdict::no_filter) {
        member["error"]["offset"] = filter.offset();
        return member;
    }
    member["remarks"] = filter.remarks();
    member["tree"] = filter.root().as_json();
    return member;
}

}  // namespace

int parse_filters(const common_options& common, const std::vector<std::string>& filters)
{
    set_g_language_tags_enabled(1);
    load_for_names(common.schema_folder);
    const schema_reader guard;
    return answer_each(common, {.list = "filters", .separator = "\n"}, filters,
                       [as_json = common.as_json](const std::string& given) {
                           const parsed_filter filter(given);
                           return answer{filter.verdict() == filter_verdict::defined, as_json ? "" : text_of(filter),
                                         as_json ? json_of(given, filter) : json()};
                       });
}

}  // namespace dirbase_tool
