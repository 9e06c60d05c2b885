// Answers to a list of questions: see answers.h.
#include "tools/dirbase/answers.h"

#include "tools/dirbase/current_failure.h"
#include "tools/dirbase/text_file.h"

namespace dirbase_tool {

namespace {

constexpr std::size_t most_held = std::size_t{1} << 16;

// Takes answers and writes them when there are enough.
class answer_writer {
public:
    answer_writer(bool as_json, const answer_form& form) : as_json_(as_json), form_(form)
    {
        held_ = as_json_ ? std::string("{\n  \"") + form_.list + "\": [" : "";
    }

    int status() const { return all_good_ ? status_yes : status_findings; }

    void put(const answer& given)
    {
        held_ += any_ ? (as_json_ ? "," : form_.separator) : "";
        held_ += as_json_ ? "\n    " + given.member.dump(-1, ' ', false, json::error_handler_t::replace) : given.text;
        any_ = true;
        all_good_ = all_good_ && given.is_good;
        if (held_.size() > most_held) {
            flush();
        }
    }

    void flush()
    {
        write_result(held_);
        held_.clear();
    }

    // Writes what is left.
    //
    //   failure  what ended the work ahead of its time, or null
    void finish(const tool_failure* failure)
    {
        if (as_json_) {
            json rest = {{"ok", failure == nullptr && all_good_}};
            if (failure != nullptr) {
                rest["error"] = json_of(*failure);
            }
            held_ += any_ ? "\n  ],\n" : "],\n";
            held_ += rest.dump(2, ' ', false, json::error_handler_t::replace).substr(2) + "\n";
        }
        flush();
    }

private:
    bool as_json_;
    answer_form form_;
    std::string held_;
    bool any_ = false;
    bool all_good_ = true;
};

}  // namespace

int answer_each(const common_options& common, const answer_form& form, const std::vector<std::string>& questions,
                const std::function<answer(const std::string&)>& ask)
{
    answer_writer out(common.as_json, form);
    const auto answer_all = [&] {
        if (form.takes_lines) {
            for_each_line_or_argument(
                questions, [&](const std::string& question) { out.put(ask(question)); }, [&] { out.flush(); });
        } else {
            for (const std::string& question : questions) {
                out.put(ask(question));
            }
        }
    };
    return write_results(common.as_json, out, [&] {
        try {
            answer_all();
        } catch (const output_failure&) {
            throw;
        } catch (...) {
            out.flush();  // the answers ahead of what failed
            throw;
        }
    });
}

}  // namespace dirbase_tool
