// The way back to a whole schema: see ldcf_schema_recover.h.
#include "servers/vrnd/libdirbase/schema/ldcf_schema_recover.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <exception>
#include <string_view>

#include "libraries/libmsg/debug_log.h"
#include "servers/vrnd/libcsgl/csgl_exception.h"
#include "servers/vrnd/libcsgl/csgl_file.h"
#include "servers/vrnd/libdirbase/schema/ldcf_schema.h"

namespace {

// Links count as what they are: a commit replaces the link and keeps it as it was.
bool stands_there(const csgl_string& path)
{
    struct stat status {};
    if (::lstat(path, &status) == 0) {
        return !S_ISDIR(status.st_mode);
    }
    if (errno != ENOENT && errno != ENOTDIR) {
        exc_t::throw_posix_error(__FILE__, __LINE__, errno);
    }
    return false;
}

void remove(const csgl_string& path)
{
    if (::unlink(path) != 0 && errno != ENOENT) {
        exc_t::throw_posix_error(__FILE__, __LINE__, errno);
    }
}

// Moves a file over another in one step. Two names of one file would both stay.
void move_over(const csgl_string& from, const csgl_string& to)
{
    debug_error("ldcf_recovery: %s takes the place of %s\n", from.c_str(), to.c_str());
    if (::rename(from, to) != 0) {
        exc_t::throw_posix_error(__FILE__, __LINE__, errno);
    }
    remove(from);
}

void remove_leftover(const csgl_string& path)
{
    debug_error("ldcf_recovery: %s is removed\n", path.c_str());
    remove(path);
}

// True when a temporary file was written to its end: the first section and the end of the last are there.
bool written_to_the_end(const csgl_string& path)
{
    csgl_file file(path, csgl_file_open_existing, csgl_file_read, csgl_file_deny_none);
    const unsigned size = file.size();
    csgl_local_array_of<char> content(std::size_t{size} + 1);
    if (file.read(content.get(), size) < size) {
        throw exc_end_of_input_t(__FILE__, __LINE__, "exc_end_of_input", 0);
    }
    const std::string_view text(content.get(), size);
    return text.starts_with("objectClasses {\n") && text.find("}\n\nmatchingRules {\n") != text.npos &&
           text.ends_with("\n}\n\n");
}

csgl_vector<csgl_string> files_of(const ldcf_schema& schema)
{
    csgl_vector<csgl_string> files;
    for (const auto& [file, state] : schema.files) {
        files.push_back(file);
    }
    return files;
}

}  // namespace

csgl_string ldcf_temporary_of(const csgl_string& file)
{
    return file + file_suffix;
}

csgl_string ldcf_backup_of(const csgl_string& file)
{
    return ldcf_temporary_of(file) + ".old";
}

ldcf_recovery::ldcf_recovery(const csgl_vector<csgl_string>& files)
{
    const auto is_leftover = [&files](const csgl_string& path) {
        return stands_there(path) && std::find(files.begin(), files.end(), path) == files.end();
    };
    for (const csgl_string& file : files) {
        const bool temporary = is_leftover(ldcf_temporary_of(file));
        const bool backup = is_leftover(ldcf_backup_of(file));
        states_.push_back({file, false, temporary, backup});
    }
    // The rest matters only where something is left over.
    if (std::any_of(states_.begin(), states_.end(), [](const state& one) { return one.temporary || one.backup; })) {
        for (state& one : states_) {
            one.there = stands_there(one.file);
        }
        found_ = judge();
    }
}

ldcf_recovery::ldcf_recovery(const ldcf_schema& schema) : ldcf_recovery(files_of(schema)) {}

// Called when there is a temporary file or a backup.
ldcf_leftovers ldcf_recovery::judge() const
{
    const auto any = [this](auto&& is_so) { return std::any_of(states_.begin(), states_.end(), is_so); };
    if (any([](const state& one) { return !one.there && !one.temporary && !one.backup; })) {
        return ldcf_leftovers::unclear;
    }
    const bool only_old = any([](const state& one) { return !one.there && !one.temporary; });
    const bool only_new = any([](const state& one) { return !one.there && !one.backup; });
    if (only_new) {
        const bool torn =
            any([](const state& one) { return one.temporary && !written_to_the_end(ldcf_temporary_of(one.file)); });
        return only_old || torn ? ldcf_leftovers::unclear : ldcf_leftovers::finish;
    }
    if (!any([](const state& one) { return one.backup; })) {
        return ldcf_leftovers::unused;
    }
    return only_old || any([](const state& one) { return one.temporary; }) ? ldcf_leftovers::undo
                                                                           : ldcf_leftovers::finish;
}

const char* ldcf_recovery::text() const
{
    switch (found_) {
    case ldcf_leftovers::none: break;
    case ldcf_leftovers::unused:
        return "a change was interrupted before its commit; what it wrote is of no use, the schema is as it was";
    case ldcf_leftovers::undo:
        return "a change was interrupted in its commit; the schema from before the change is in force";
    case ldcf_leftovers::finish:
        return "a change was interrupted at the end of its commit; the changed schema is in force";
    case ldcf_leftovers::unclear:
        return "a change was interrupted and a file is missing; neither the schema from before the change nor the "
               "changed one is whole, and nothing was touched";
    }
    return "";
}

csgl_vector<csgl_string> ldcf_recovery::concerned() const
{
    csgl_vector<csgl_string> files;
    for (const state& one : states_) {
        if (one.temporary || one.backup) {
            files.push_back(one.file);
        }
    }
    return files;
}

csgl_string ldcf_recovery::source_of(const csgl_string& file) const
{
    const auto one = std::find_if(states_.begin(), states_.end(), [&](const state& s) { return s.file == file; });
    if (one != states_.end() && found_ == ldcf_leftovers::undo && one->backup) {
        return ldcf_backup_of(file);
    }
    if (one != states_.end() && found_ == ldcf_leftovers::finish && one->temporary) {
        return ldcf_temporary_of(file);
    }
    return file;
}

// What gives the verdict goes last: with a temporary file, or else a missing file, the commit was not through.
void ldcf_recovery::put_back()
{
    for (const bool there : {true, false}) {
        for (const state& one : states_) {
            if (one.backup && one.there == there) {
                move_over(ldcf_backup_of(one.file), one.file);
            }
        }
    }
    for (const state& one : states_) {
        if (one.temporary) {
            remove_leftover(ldcf_temporary_of(one.file));
        }
    }
}

// A missing file whose old content nobody kept gives the verdict and goes last; from then on no temporary file is left.
void ldcf_recovery::carry_on()
{
    for (const bool only_new : {false, true}) {
        for (const state& one : states_) {
            if (one.temporary && (!one.there && !one.backup) == only_new) {
                move_over(ldcf_temporary_of(one.file), one.file);
            }
        }
    }
    for (const state& one : states_) {
        if (one.backup) {
            remove_leftover(ldcf_backup_of(one.file));
        }
    }
}

void ldcf_recovery::run()
{
    if (found_ == ldcf_leftovers::none) {
        return;
    }
    debug_error("ldcf_recovery: %s\n", text());
    switch (found_) {
    case ldcf_leftovers::none:
    case ldcf_leftovers::unclear: return;
    case ldcf_leftovers::unused:
    case ldcf_leftovers::undo: put_back(); break;
    case ldcf_leftovers::finish: carry_on(); break;
    }
    for (state& one : states_) {
        one = {one.file, true, false, false};
    }
    found_ = ldcf_leftovers::none;
}

int ldcf_recover_files(const char* const* files, std::size_t count)
{
    try {
        ldcf_recovery recovery(csgl_vector<csgl_string>(files, files + count));
        recovery.run();
        return recovery.found() == ldcf_leftovers::none ? 0 : 1;
    } catch (const exc_t& failure) {
        debug_error("Error - ldcf_recover_files: %s\n", failure.message().text());
    } catch (const std::exception& failure) {
        debug_error("Error - ldcf_recover_files: %s\n", failure.what());
    }
    return 1;
}
