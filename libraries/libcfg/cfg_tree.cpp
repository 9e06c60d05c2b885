// Names, filters and searches of the configuration tree: see cfg_tree.h.
#include "libraries/libcfg/cfg_tree.h"

#include <algorithm>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "libraries/libcfg/cfg.h"

namespace {

char lower(char c)
{
    return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}

bool is_blank(char c)
{
    return c == ' ' || c == '\t';
}

// Compares a text with one in lower case, and makes no copy of what may be a password.
bool equals(std::string_view text, std::string_view in_lower_case)
{
    return std::equal(text.begin(), text.end(), in_lower_case.begin(), in_lower_case.end(),
                      [](char a, char b) { return lower(a) == b; });
}

int hex_digit(char c)
{
    c = lower(c);
    return c >= '0' && c <= '9' ? c - '0' : c >= 'a' && c <= 'f' ? c - 'a' + 10 : -1;
}

// Reads a DN from left to right, and keeps its RDNs in normal form.
class dn_reader {
public:
    bool read(std::string_view dn)
    {
        for (std::size_t i = 0; i < dn.size(); ++i) {
            const char c = dn[i];
            if ((c == '\\' || c == '"') && !in_value_) {
                return false;
            }
            if (c == '\\') {
                if (++i == dn.size()) {
                    return false;
                }
                put(c);
                put(dn[i]);
            } else if (c == '"') {
                quoted_ = !quoted_;
                put(c);
            } else if (!quoted_ && is_blank(c)) {
                blanks_ += c;
            } else if (c == '=' && !in_value_) {
                if (!separator(c, !at_start_)) {
                    return false;
                }
                in_value_ = true;
            } else if (!quoted_ && (c == '+' || c == ',' || c == ';')) {
                if (!separator(c, in_value_)) {
                    return false;
                }
                in_value_ = false;
            } else {
                put(c);
            }
        }
        rdns_.push_back(std::move(rdn_));
        return in_value_ && !quoted_;
    }

    std::string key() const
    {
        std::string key = rdns_.back();
        for (auto rdn = rdns_.rbegin() + 1; rdn != rdns_.rend(); ++rdn) {
            key += cfg_rdn_end;
            key += *rdn;
        }
        return key;
    }

private:
    // Blanks count only between two other characters.
    void put(char c)
    {
        if (!at_start_) {
            rdn_ += blanks_;
        }
        blanks_.clear();
        rdn_ += lower(c);
        at_start_ = false;
    }

    bool separator(char c, bool in_place)
    {
        blanks_.clear();
        at_start_ = true;
        if (c == '=' || c == '+') {
            rdn_ += c;
        } else {
            rdns_.push_back(std::exchange(rdn_, {}));
        }
        return in_place;
    }

    std::vector<std::string> rdns_;
    std::string rdn_;
    std::string blanks_;     // not yet known to count
    bool at_start_ = true;   // of a type or a value
    bool in_value_ = false;  // else in a type
    bool quoted_ = false;
};

}  // namespace

std::string to_lower(std::string_view text)
{
    std::string result(text);
    std::transform(result.begin(), result.end(), result.begin(), lower);
    return result;
}

const cfg_attribute* cfg_entry::find(std::string_view name) const
{
    const auto place = places.find(to_lower(name));
    return place == places.end() ? nullptr : &attributes[place->second];
}

void cfg_entry::add(std::string_view name, cfg_value value)
{
    const auto [place, fresh] = places.try_emplace(to_lower(name), attributes.size());
    if (fresh) {
        attributes.push_back({std::string(name), {}});
    }
    attributes[place->second].values.push_back(std::move(value));
}

bool make_cfg_key(std::string_view dn, std::string& key)
{
    if (dn.find(cfg_rdn_end) != std::string_view::npos) {
        return false;
    }
    if (std::all_of(dn.begin(), dn.end(), is_blank)) {
        key.clear();
        return true;
    }
    dn_reader reader;
    if (!reader.read(dn)) {
        return false;
    }
    key = reader.key();
    return true;
}

bool cfg_filter::parse(std::string_view text)
{
    if (text.starts_with('(') && text.ends_with(')')) {
        text = text.substr(1, text.size() - 2);
    }
    const std::size_t equals = text.find('=');
    if (equals == std::string_view::npos || equals == 0) {
        return false;
    }
    attribute = text.substr(0, equals);
    // The other kinds of assertion end in a character of their own ahead of the "=".
    if (attribute.find_first_of(" &|!()*\\~<>:") != std::string::npos) {
        return false;
    }
    const std::string_view right = text.substr(equals + 1);
    presence = right == "*";
    if (presence) {
        return true;
    }
    for (std::size_t i = 0; i < right.size(); ++i) {
        if (right[i] == '*' || right[i] == '(' || right[i] == ')') {
            return false;
        }
        if (right[i] != '\\') {
            value += lower(right[i]);
            continue;
        }
        const int high = i + 2 < right.size() ? hex_digit(right[i + 1]) : -1;
        const int low = high >= 0 ? hex_digit(right[i + 2]) : -1;
        if (low < 0) {
            return false;
        }
        value += lower(static_cast<char>(high * 16 + low));
        i += 2;
    }
    return true;
}

bool cfg_filter::matches(const cfg_entry& entry) const
{
    if (presence && to_lower(attribute) == "objectclass") {
        return true;
    }
    const cfg_attribute* const found = entry.find(attribute);
    return found != nullptr && (presence || std::any_of(found->values.begin(), found->values.end(),
                                                        [this](const cfg_value& v) { return equals(v.text, value); }));
}

cfg_failure search_cfg_tree(const cfg_tree& tree, const std::string& base_key, int scope, const cfg_filter& filter,
                            std::vector<const cfg_entry*>& found)
{
    const auto take = [&](const cfg_entry& entry) {
        if (filter.matches(entry)) {
            found.push_back(&entry);
        }
    };
    const auto base = tree.find(base_key);
    if (base == tree.end() && (!base_key.empty() || scope == CFG_SCOPE_BASE)) {
        return {LDAP_NO_SUCH_OBJECT, "there is no such entry"};
    }
    if (base != tree.end() && scope != CFG_SCOPE_ONE) {
        take(base->second);
    }
    if (scope != CFG_SCOPE_BASE) {
        const std::string prefix = base_key.empty() ? "" : base_key + cfg_rdn_end;
        for (auto at = tree.lower_bound(prefix); at != tree.end() && at->first.starts_with(prefix); ++at) {
            if (scope == CFG_SCOPE_SUB || at->first.find(cfg_rdn_end, prefix.size()) == std::string::npos) {
                take(at->second);
            }
        }
    }
    return {};
}
