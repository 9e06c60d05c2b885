// What there is to say about one definition: see definition_sheet.h.
#include "tools/dirbase/definition_sheet.h"

namespace dirbase_tool {

namespace {

constexpr char nothing[] = "none";
constexpr std::size_t label_width = 22;

}  // namespace

definition_sheet::definition_sheet(const std::string& kind, const std::string& name) : title_(kind + " " + name)
{
    members_["kind"] = kind;
    members_["name"] = json_of_value(name);
}

void definition_sheet::add(const std::string& label, const std::string& key, const std::string& value)
{
    add(label, value.empty() ? nothing : value, key, value.empty() ? json() : json_of_value(value));
}

void definition_sheet::add(const std::string& label, const std::string& key, const std::vector<std::string>& values)
{
    add(label, joined(values), key, json_of_values(values));
}

void definition_sheet::add(const std::string& label, const std::string& key, bool value)
{
    add(label, value ? "yes" : "no", key, value);
}

void definition_sheet::add(const std::string& label, const std::string& text, const std::string& key, json value)
{
    add_line(label, text);
    add_member(key, std::move(value));
}

void definition_sheet::add_line(const std::string& label, const std::string& text)
{
    lines_.push_back({label, text});
}

void definition_sheet::add_member(const std::string& key, json value)
{
    members_[key] = std::move(value);
}

std::string definition_sheet::as_text() const
{
    std::string text = on_one_line(title_) + "\n";
    for (const labelled& line : lines_) {
        text.append("  ").append(line.label);
        text.append(line.label.size() < label_width ? label_width - line.label.size() : 1, ' ');
        text.append(on_one_line(line.text)).append("\n");
    }
    return text;
}

std::string joined(const std::vector<std::string>& values)
{
    std::string text;
    for (const std::string& value : values) {
        text.append(text.empty() ? "" : ", ").append(value);
    }
    return text.empty() ? nothing : text;
}

}  // namespace dirbase_tool
