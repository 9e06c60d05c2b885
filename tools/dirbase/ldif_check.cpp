// dirbase ldif check
//
// One thread reads batches of whole entries and prints what was found, in the order of the file; others check the
// batches (ldif_pool.h).
#include <cerrno>
#include <cstring>
#include <vector>

#include "tools/dirbase/current_failure.h"
#include "tools/dirbase/ldif_commands.h"
#include "tools/dirbase/ldif_pool.h"
#include "tools/dirbase/ldif_reader.h"
#include "tools/dirbase/progress.h"
#include "tools/dirbase/schema_directory.h"
#include "tools/dirbase/text_file.h"

namespace dirbase_tool {

namespace {

struct totals {
    std::size_t entries = 0;
    std::size_t refused = 0;
    ldif_fault_counts counts = {};

    void add(const totals& more)
    {
        entries += more.entries;
        refused += more.refused;
        for (std::size_t i = 0; i < counts.size(); ++i) {
            counts[i] += more.counts[i];
        }
    }
};

// A batch and what came of it.
struct work {
    ldif_batch batch;
    std::string told;     // the faults, as lines or as items of a JSON array
    std::string rejects;  // the refused entries with their faults
    totals found;
};

struct check_settings {
    check_options checks;
    std::string source;
    bool as_json;
    bool with_rejects;
};

std::string_view without_empty_lines(std::string_view text)
{
    const std::size_t first = text.find_first_not_of("\r\n");
    return first == std::string_view::npos ? std::string_view()
                                           : text.substr(first, text.find_last_not_of("\r\n") + 1 - first);
}

// Checks batches, one at a time; each thread has its own.
class batch_checker {
public:
    explicit batch_checker(const check_settings& settings) : settings_(settings) {}

    void operator()(work& item);

private:
    void check_one(work& item, const ldif_entry_text& entry);
    void tell(work& item, std::string_view entry, bool as_it_stood);

    const check_settings& settings_;
    ldif_text text_;
    ldif_fault_list faults_;
};

void batch_checker::operator()(work& item)
{
    item.told.clear();
    item.rejects.clear();
    item.found = {};
    const schema_reader guard;
    ldif_entry_text entry;
    while (item.told.size() + item.rejects.size() < results_limit && take_entry(item.batch, entry)) {
        check_one(item, entry);
    }
}

void batch_checker::check_one(work& item, const ldif_entry_text& entry)
{
    faults_.clear();
    const ldif_text::content content = text_.parse(entry, faults_);
    if (content == ldif_text::content::nothing) {
        return;
    }
    if (content == ldif_text::content::entry) {
        check_entry(text_, settings_.checks, faults_);
    }
    ++item.found.entries;
    if (!faults_.empty()) {
        ++item.found.refused;
        tell(item, entry.text, item.batch.aside == nullptr);
    }
}

// Puts the faults of an entry among what is told, and the entry among the rejects.
//
//   as_it_stood  false when the rejects take the entry from elsewhere
void batch_checker::tell(work& item, std::string_view entry, bool as_it_stood)
{
    bool begins_with_fold = false;
    for (const ldif_fault& fault : faults_.kept()) {
        begins_with_fold = begins_with_fold || fault.kind == ldif_fault_kind::fold_at_start;
        if (settings_.as_json) {
            item.told +=
                (item.told.empty() ? "    " : ",\n    ") +
                json_of(fault, settings_.source, dn_of(text_)).dump(-1, ' ', false, json::error_handler_t::replace);
        }
    }
    for (const std::string& line : lines_of(faults_, text_, settings_.source)) {
        item.told += settings_.as_json ? "" : line + "\n";
        item.rejects += settings_.with_rejects ? "# " + line + "\n" : "";
    }
    for (std::size_t i = 0; i < ldif_fault_kinds; ++i) {
        item.found.counts[i] += faults_.counts()[i];
    }
    if (settings_.with_rejects && as_it_stood) {
        item.rejects += begins_with_fold ? "\n" : "";  // else the comment would be continued
        item.rejects += without_empty_lines(entry);
        item.rejects += "\n\n";
    }
}

// The file that takes the refused entries.
class rejects_file {
public:
    rejects_file(const std::string& path, const ldif_reader& input) : path_(path)
    {
        if (path.empty()) {
            return;
        }
        if (path == standard_input || input.is_file(path)) {
            throw tool_failure(status_unusable, path, 0,
                               path == standard_input ? "the rejects need a file"
                                                      : "the rejects can't go to the input");
        }
        file_.reset(std::fopen(path.c_str(), "wb"));
        if (file_ == nullptr) {
            throw tool_failure(status_unusable, path, 0, std::strerror(errno));
        }
    }

    void write(const work& item)
    {
        if (file_ == nullptr) {
            return;
        }
        put(item.rejects);
        if (std::FILE* const aside = item.batch.aside.get(); aside != nullptr) {
            std::rewind(aside);
            std::vector<char> chunk(std::size_t{1} << 16);
            char last = '\n';
            for (std::size_t got = 0; (got = std::fread(chunk.data(), 1, chunk.size(), aside)) > 0;) {
                put({chunk.data(), got});
                last = chunk[got - 1];
            }
            put(last == '\n' ? "" : "\n\n");  // the empty line is there, unless the input ended
        }
    }

    void close()
    {
        if (file_ != nullptr && std::fclose(file_.release()) != 0) {
            throw tool_failure(status_unusable, path_, 0, std::strerror(errno));
        }
    }

private:
    void put(std::string_view text)
    {
        if (std::fwrite(text.data(), 1, text.size(), file_.get()) != text.size()) {
            throw tool_failure(status_unusable, path_, 0, std::strerror(errno));
        }
    }

    std::string path_;
    file_pointer file_;
};

// Takes the checked batches in their order: prints, rejects, counts.
class findings {
public:
    findings(const check_settings& settings, ldif_reader& reader, rejects_file& rejects)
        : settings_(settings), reader_(reader), rejects_(rejects)
    {
    }

    void take(const work& item);
    void finish(const tool_failure* failure);
    int status() const { return found_.refused == 0 ? status_yes : status_findings; }

private:
    std::string summary() const;

    const check_settings& settings_;
    ldif_reader& reader_;
    rejects_file& rejects_;
    totals found_;
    bool told_ = false;
    progress progress_;
};

void findings::take(const work& item)
{
    found_.add(item.found);
    rejects_.write(item);
    if (!item.told.empty()) {
        progress_.clear();
        const char* const in_front = !settings_.as_json ? "" : told_ ? ",\n" : "{\n  \"faults\": [\n";
        write_result(in_front + item.told);
        told_ = true;
    }
    if (progress_.is_due()) {
        std::string line = std::to_string(found_.entries) + " entries, " + std::to_string(found_.refused) + " refused";
        if (reader_.bytes_in_all() != 0) {
            line += ", " + std::to_string(100 * reader_.bytes_read() / reader_.bytes_in_all()) + "% read";
        }
        progress_.show(line);
    }
}

std::string findings::summary() const
{
    std::string text = std::to_string(found_.entries) + " entries, " + std::to_string(found_.entries - found_.refused) +
                       " accepted, " + std::to_string(found_.refused) + " refused\n";
    for (std::size_t i = 0; i < ldif_fault_kinds; ++i) {
        if (found_.counts[i] != 0) {
            const ldif_fault_words& words = words_of(static_cast<ldif_fault_kind>(i));
            const std::string count = std::to_string(found_.counts[i]);
            const std::string name = words.name;
            text.append(count.size() < 8 ? 8 - count.size() : 0, ' ').append(count).append("  ").append(name);
            text.append(name.size() < 21 ? 21 - name.size() : 1, ' ').append(words.meaning).append("\n");
        }
    }
    return text;
}

// Writes what comes last; with a failure that ended the work ahead of its time.
void findings::finish(const tool_failure* failure)
{
    progress_.clear();
    if (!settings_.as_json) {
        write_result(failure == nullptr ? summary() : "");
        return;
    }
    json kinds = json::object();
    for (std::size_t i = 0; i < ldif_fault_kinds; ++i) {
        if (found_.counts[i] != 0) {
            kinds[words_of(static_cast<ldif_fault_kind>(i)).name] = found_.counts[i];
        }
    }
    json rest = {{"entries", found_.entries},
                 {"accepted", found_.entries - found_.refused},
                 {"refused", found_.refused},
                 {"kinds", std::move(kinds)},
                 {"ok", failure == nullptr && found_.refused == 0}};
    if (failure != nullptr) {
        rest["error"] = json_of(*failure);
    }
    const std::string text = rest.dump(2, ' ', false, json::error_handler_t::replace);
    write_result((told_ ? "\n  ],\n" : "{\n  \"faults\": [],\n") + text.substr(2) + "\n");
}

}  // namespace

void load_for_entries(const common_options& common)
{
    ldcf_api_schema_init();
    load_for_names(common.schema_folder);
}

int check_ldif(const common_options& common, const ldif_check_call& call)
{
    load_for_entries(common);
    const check_settings settings = {call.checks, source_name(call.file), common.as_json, !call.rejects.empty()};
    ldif_reader reader(call.file, settings.with_rejects);
    rejects_file rejects(call.rejects, reader);
    findings out(settings, reader, rejects);
    return write_results(common.as_json, out, [&] {
        for_each_batch<work>(
            reader, ldif_threads(call.threads), [&settings] { return batch_checker(settings); },
            [&out](const work& item) {
                out.take(item);
                return true;
            });
        rejects.close();
    });
}

}  // namespace dirbase_tool
