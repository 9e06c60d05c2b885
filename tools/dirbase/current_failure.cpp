// Failures of commands that write piece by piece: see current_failure.h.
#include "tools/dirbase/current_failure.h"

#include <new>

namespace dirbase_tool {

tool_failure current_failure(const std::string& about)
{
    try {
        throw;
    } catch (const tool_failure& failure) {
        return failure;
    } catch (const exc_t& failure) {
        return failure_of(failure, about);
    } catch (const std::bad_alloc&) {
        return {status_unusable, "", 0, "not enough memory"};
    } catch (const std::exception& failure) {
        return {status_unusable, "", 0, failure.what()};
    }
}

}  // namespace dirbase_tool
