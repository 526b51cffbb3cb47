#include "input/text_file.h"

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <cstddef>
#include <cstring>
#include <fstream>
#include <system_error>

#include "input/json_reader.h"

namespace input {

namespace {

constexpr std::size_t kLongestFile = std::size_t{1} << 20U;

}  // namespace

std::string readTextFile(const std::filesystem::path& path, std::string_view what) {
    std::error_code ignored;
    if (std::filesystem::is_directory(path, ignored)) {
        throw DocumentProblem(path.string() + ": a folder, not " + std::string(what));
    }
    errno = 0;
    std::ifstream stream(path, std::ios::binary);
    std::string text(kLongestFile + 1, '\0');
    stream.read(text.data(), static_cast<std::streamsize>(text.size()));
    if (!stream.is_open() || stream.bad()) {
        throw DocumentProblem(path.string() + ": cannot be read: " + std::strerror(errno));
    }
    text.resize(static_cast<std::size_t>(stream.gcount()));
    if (text.size() > kLongestFile) {
        throw DocumentProblem(path.string() + ": longer than 1 MiB");
    }
    return text;
}

std::string oneLine(std::string text) {
    std::replace_if(
        text.begin(), text.end(), [](unsigned char c) { return std::iscntrl(c) != 0; }, '?');
    return text;
}

}  // namespace input
