// Answers to a list of questions, one after the other: written as they come, so that a list of any length can be asked.
#pragma once

#include <functional>
#include <string>
#include <vector>

#include "tools/dirbase/report.h"
#include "tools/dirbase/schema_commands.h"

namespace dirbase_tool {

// What there is to say about one question. Only one of text and member is written.
struct answer {
    bool is_good = false;
    std::string text;
    json member = {};
};

struct answer_form {
    const char* list;            // what JSON calls the list of answers
    const char* separator = "";  // what stands between the texts of two answers
    bool takes_lines = true;     // "-" stands for the questions on standard input, one a line
};

// Writes the answer to each question, in JSON as a list behind which "ok" stands. Returns status_yes when all are good,
// else status_findings. Questions that can't be read raise tool_failure behind the answers to those ahead of them; with
// JSON it is told here, closes the object, and gives its status.
int answer_each(const common_options& common, const answer_form& form, const std::vector<std::string>& questions,
                const std::function<answer(const std::string&)>& ask);

}  // namespace dirbase_tool
