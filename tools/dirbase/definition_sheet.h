// What there is to say about one definition, gathered once and shown as lines of text or as a JSON object.
#pragma once

#include <string>
#include <vector>

#include "tools/dirbase/report.h"

namespace dirbase_tool {

class definition_sheet {
public:
    // kind  such as "attribute type"; name the primary name
    definition_sheet(const std::string& kind, const std::string& name);

    // Add a line with a label, and a member with a key. The texts are those of the schema, as they are; an empty one is
    // shown as "none", and null in JSON.
    void add(const std::string& label, const std::string& key, const std::string& value);
    void add(const std::string& label, const std::string& key, const std::vector<std::string>& values);
    void add(const std::string& label, const std::string& key, bool value);

    // A line and a member that differ in more than their shape.
    void add(const std::string& label, const std::string& text, const std::string& key, json value);

    // A line for the eyes only.
    void add_line(const std::string& label, const std::string& text);
    void add_member(const std::string& key, json value);

    std::string as_text() const;
    const json& as_json() const { return members_; }

private:
    struct labelled {
        std::string label;
        std::string text;
    };

    std::string title_;
    std::vector<labelled> lines_;
    json members_;
};

// "a, b, c", or "none".
std::string joined(const std::vector<std::string>& values);

}  // namespace dirbase_tool
