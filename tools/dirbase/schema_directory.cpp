// A schema directory: see schema_directory.h.
#include "tools/dirbase/schema_directory.h"

#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <string_view>

#include "servers/vrnd/libdirbase/base/backend.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api.h"
#include "servers/vrnd/libdirbase/schema/ldcf_schema_recover.h"
#include "tools/dirbase/report.h"
#include "tools/dirbase/text_file.h"

namespace fs = std::filesystem;

namespace dirbase_tool {

namespace {

constexpr char list_name[] = "schema.list";
constexpr char environment_variable[] = "DIRBASE_SCHEMA";

// Where the link that a build puts next to its tool leads to: the source tree's schema. Empty for an installed tool.
fs::path linked_folder(const fs::path& tool)
{
    std::error_code error;
    const fs::path link = tool.parent_path() / "schema";
    const fs::path target = fs::is_symlink(link, error) ? fs::canonical(link, error) : fs::path();
    return error ? fs::path() : target;
}

// The schema that came with the tool: beside an installed tool, wherever the installation was moved to; in the
// source tree of a tool that was built and not installed; and last where the build was configured to install it.
std::string shipped_folder()
{
    std::error_code error;
    const fs::path tool = fs::read_symlink("/proc/self/exe", error);
    const fs::path candidates[] = {
        error ? fs::path() : (tool.parent_path() / DIRBASE_RELATIVE_SCHEMA_DIR).lexically_normal(),
        error ? fs::path() : linked_folder(tool),
        DIRBASE_INSTALLED_SCHEMA_DIR,
    };
    for (const fs::path& candidate : candidates) {
        if (!candidate.empty() && fs::exists(candidate / list_name, error)) {
            return candidate.string();
        }
    }
    throw tool_failure(status_unusable, "", 0,
                       "no schema found: name its directory with --schema or in the environment variable " +
                           std::string(environment_variable));
}

std::string find_folder(const std::string& named)
{
    if (!named.empty()) {
        return named;
    }
    const char* in_environment = std::getenv(environment_variable);
    if (in_environment != nullptr && *in_environment != '\0') {
        return in_environment;
    }
    return shipped_folder();
}

std::string_view without_blanks(std::string_view line)
{
    constexpr std::string_view blanks = " \t\r\v\f";
    const std::size_t first = line.find_first_not_of(blanks);
    return first == std::string_view::npos ? std::string_view()
                                           : line.substr(first, line.find_last_not_of(blanks) - first + 1);
}

// Table names depend on there being a relational back end. The tool has no store behind it, and needs none.
void announce_relational_store()
{
    static Backend relational_store = {.be_type = "rdbm"};
    g_backends = &relational_store;
}

void complete(ldcf_schema& schema)
{
    schema.complete();
    schema.complete_db_names();
}

}  // namespace

schema_directory::schema_directory(const std::string& folder, purpose why)
    : folder_(find_folder(folder)), list_((fs::path(folder_) / list_name).string())
{
    announce_relational_store();
    const bool locked = lock(why);
    read_list();
    recover(why, locked);
}

schema_directory::~schema_directory()
{
    if (lock_handle_ >= 0) {
        ::close(lock_handle_);
    }
}

// The lock is on schema.list, which no change replaces. Only a change depends on it: what reads a folder on a file
// system without locks may at worst meet a file that is missing for a moment. Returns whether there is a lock.
bool schema_directory::lock(purpose why)
{
    lock_handle_ = ::open(list_.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK);
    if (lock_handle_ < 0) {
        throw tool_failure(status_unusable, list_, 0, std::strerror(errno));
    }
    const int failure = take_lock(why == purpose::change ? LOCK_EX : LOCK_SH);
    if (failure != 0 && why == purpose::change) {
        throw tool_failure(status_unusable, list_, 0, std::string("can't be locked: ") + std::strerror(failure));
    }
    return failure == 0;
}

// Takes the lock, or exchanges the one that is held, and returns 0 or the errno.
int schema_directory::take_lock(int kind)
{
    int failed = ::flock(lock_handle_, kind | LOCK_NB);
    if (failed != 0 && errno == EWOULDBLOCK) {
        tell("waiting for another run that has " + list_ + " locked");
        do {
            failed = ::flock(lock_handle_, kind);
        } while (failed != 0 && errno == EINTR);
    }
    return failed == 0 ? 0 : errno;
}

// Temporary files alone are no reader's business: the schema files are whole, and the next change removes them.
//
// A reader that has to move files takes the folder for itself, for the rest of its run. Others may come first, so it
// looks again. Without a lock it can't know that the change isn't just running, and moves nothing.
void schema_directory::recover(purpose why, bool locked)
{
    csgl_vector<csgl_string> paths;
    for (const listed_file& file : files_) {
        paths.emplace_back(file.path.c_str());
    }
    const bool only_reads = why == purpose::read;
    ldcf_recovery leftovers(paths);
    if (leftovers.found() == ldcf_leftovers::none || (only_reads && leftovers.found() == ldcf_leftovers::unused)) {
        return;
    }
    std::string refusal;
    if (only_reads) {
        locked = locked && take_lock(LOCK_EX) == 0;
        refusal = locked ? "" : "it can't be locked";
        leftovers = ldcf_recovery(paths);
    }
    const std::string what = leftovers.text();
    std::string where;
    for (const csgl_string& file : leftovers.concerned()) {
        where += (where.empty() ? " (" : ", ") + name_of(text_of(file));
    }
    if (refusal.empty()) {
        try {
            leftovers.run();
        } catch (const exc_t& failure) {
            if (!only_reads) {
                throw failure_of(failure, folder_);
            }
            refusal = failure_of(failure).what();
            leftovers = ldcf_recovery(paths);  // some of the steps may have been taken
        }
    }
    for (listed_file& file : files_) {
        file.source = text_of(leftovers.source_of(file.path.c_str()));
    }
    if (!where.empty()) {
        tell(folder_ + ": " + what + where + ")" +
             (refusal.empty() ? "" : "; the folder is left as it is, since " + refusal));
    }
}

void schema_directory::read_list()
{
    const std::string text = read_text(list_, text_source::regular_file);
    std::string_view rest = text;
    while (!rest.empty()) {
        const std::size_t end = rest.find('\n');
        const std::string_view line = without_blanks(rest.substr(0, end));
        rest.remove_prefix(end == std::string_view::npos ? rest.size() : end + 1);
        if (!line.empty() && line.front() != '#') {
            const std::string path = (fs::path(folder_) / line).string();
            files_.push_back({std::string(line), path, path});
        }
    }
    if (files_.empty()) {
        throw tool_failure(status_unusable, list_, 0, "names no schema file");
    }
}

std::string schema_directory::name_of(const std::string& path) const
{
    for (const listed_file& file : files_) {
        if (file.path == path) {
            return file.name;
        }
    }
    return path;
}

void schema_directory::load(const std::vector<std::string>& more) const
{
    ldcf_schema& schema = *ldcf_schema_g;
    for (const listed_file& file : files_) {
        parse_schema_text(schema, read_text(file.source, text_source::regular_file), file.path, file.source);
    }
    for (const std::string& path : more) {
        parse_schema_text(schema, read_text(path, text_source::any), source_name(path), source_name(path));
    }
    complete(schema);
}

void schema_directory::load_other(ldcf_schema& schema,
                                  const std::function<std::string(const std::string& path)>& stand_in) const
{
    for (const listed_file& file : files_) {
        parse_schema_text(schema, read_text(stand_in(file.path), text_source::regular_file), file.path, file.path);
    }
    complete(schema);
}

void load_for_names(const std::string& folder)
{
    const schema_directory directory(folder, schema_directory::purpose::read);
    directory.load();
    ldcf_api_load_attr_hash();
}

// ldcf_schema::parse would read the file again, and perhaps not what was looked at; it also stops in silence at a
// byte 0 and at 4 GiB.
void parse_schema_text(ldcf_schema& schema, const std::string& text, const std::string& path, const std::string& source)
{
    const auto at_place = [&source](const exc_t& fault) {
        return tool_failure(status_findings, source, fault.line(), fault.message().text());
    };
    try {
        schema.parse_str(text.c_str(), path.c_str());
    } catch (const exc_invalid_token_t& fault) {
        throw at_place(fault);
    } catch (const exc_invalid_grammar_t& fault) {
        throw at_place(fault);
    } catch (const exc_unexpected_end_of_input_t& fault) {
        throw at_place(fault);
    }
    const csgl_string file(path.c_str());
    schema.files[file] = ldcf_schema::modified_indicator::flushed;
    schema.current_file = file;
}

}  // namespace dirbase_tool
