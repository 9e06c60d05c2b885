// Failures of commands that write their results piece by piece.
//
// What they have written stands; so with --json the object that was begun is ended, and says what went wrong (json_of).
#pragma once

#include "tools/dirbase/report.h"

namespace dirbase_tool {

// What the exception that is being handled means to the user. Called inside a handler, but not one of an output_failure.
// Whatever isn't a tool_failure and no refusal by the library has status_unusable.
//
//   about  as for failure_of
tool_failure current_failure(const std::string& about = "");

// Does work that writes results, and ends them.
//
//   results  has finish(const tool_failure*), which writes what comes last, with what ended the work ahead of its time
//            or null; and status(), the exit status when nothing did
//   work     writes results; what it raises is told when it is for programs, and goes on to the caller otherwise
//
// Returns the exit status.
template <typename Results, typename Work>
int write_results(bool as_json, Results& results, const Work& work)
{
    try {
        work();
    } catch (const output_failure&) {
        throw;  // with nowhere to end the results
    } catch (...) {
        if (!as_json) {
            throw;
        }
        const tool_failure failure = current_failure();
        tell(failure.message());
        results.finish(&failure);
        return failure.status();
    }
    results.finish(nullptr);
    return results.status();
}

}  // namespace dirbase_tool
