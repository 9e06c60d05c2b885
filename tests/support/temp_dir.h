// A folder of a test's own, removed with everything in it when the object goes.
#pragma once

#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <stdexcept>
#include <string>
#include <string_view>
#include <system_error>

namespace test_support {

// The whole content of a file.
inline std::string file_text(const std::filesystem::path& file)
{
    std::ifstream in(file, std::ios::binary);
    if (!in) {
        throw std::runtime_error("can't read " + file.string());
    }
    return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
}

// Every failure is raised as an exception, which fails the test that asked. Not to be shared between threads; two
// objects never share a folder, in one process or in several.
class temp_dir {
public:
    // Makes a new folder, readable by its owner only, below TMPDIR or else /tmp.
    temp_dir()
    {
        std::string name = (std::filesystem::temp_directory_path() / "dirbase-test-XXXXXX").string();
        if (mkdtemp(name.data()) == nullptr) {
            throw std::system_error(errno, std::generic_category(), name);
        }
        path_ = name;
    }

    // What can't be removed (a test took the permissions away) is left behind: a destructor has nobody to tell.
    ~temp_dir()
    {
        std::error_code ignored;
        std::filesystem::remove_all(path_, ignored);
    }

    temp_dir(const temp_dir&) = delete;
    temp_dir& operator=(const temp_dir&) = delete;

    // The full path of the folder, or of `name` in it, which need not exist.
    std::string path() const { return path_.string(); }
    std::string path(std::string_view name) const { return (path_ / name).string(); }

    // Writes `text`, byte for byte, to the file `name`, in place of what it held; missing folders on the way are made.
    // Returns the full path.
    std::string write(std::string_view name, std::string_view text) const
    {
        const std::filesystem::path file = path_ / name;
        std::filesystem::create_directories(file.parent_path());
        std::ofstream out(file, std::ios::binary | std::ios::trunc);
        out.exceptions(std::ios::failbit | std::ios::badbit);
        out << text << std::flush;
        return file.string();
    }

    // The whole content of the file `name`.
    std::string read(std::string_view name) const { return file_text(path_ / name); }

private:
    std::filesystem::path path_;
};

}  // namespace test_support
