// Swallows messages for the whole program: what the library tells the administrator must not end up in the table of
// figures, nor the terminal in the measured time.
#include "libraries/libmsg/message_log.h"

namespace {

[[maybe_unused]] const bool installed = [] {
    set_message_sink([](void*, const message_record&) {}, nullptr);
    return true;
}();

}  // namespace
