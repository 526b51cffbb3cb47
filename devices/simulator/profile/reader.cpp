#include "devices/simulator/profile/reader.h"

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <cstddef>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <utility>

#include "devices/simulator/profile/gallery_text.h"
#include "devices/simulator/profile/part_readers.h"
#include "input/json_reader.h"
#include "input/nearest.h"

namespace simulator {

using input::DocumentProblem;
using input::Json;
using input::JsonKey;
using input::JsonNode;
using input::parseJson;
using input::readObject;

namespace {

constexpr std::size_t kLongestFile = std::size_t{1} << 20U;
constexpr std::size_t kLongestChain = 16;

bool isControl(char character) {
    return std::iscntrl(static_cast<unsigned char>(character)) != 0;
}

// A document that describes a device, or a part of it.
struct Source {
    bool isFile;                   // or else of the gallery
    std::string name;              // of the profile or the file
    std::filesystem::path folder;  // that other files are relative to
    std::string text;

    bool isSame(const Source& other) const { return isFile == other.isFile && name == other.name; }
};

Source builtIn(const std::string& name) {
    std::vector<std::string> known;
    for (const GalleryText& profile : galleryTexts()) {
        if (profile.name == name) {
            return {false, name, {}, std::string(profile.text)};
        }
        known.emplace_back(profile.name);
    }
    throw DocumentProblem("unknown device \"" + name + "\"" + input::didYouMean(name, known));
}

Source file(const std::filesystem::path& path) {
    std::error_code ignored;
    if (std::filesystem::is_directory(path, ignored)) {
        throw DocumentProblem(path.string() + ": a folder, not a profile");
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
    return {true, path.string(), path.parent_path(), std::move(text)};
}

Source findSource(const std::string& nameOrFile, const std::filesystem::path& folder) {
    const bool isFile = nameOrFile.find_first_of("/.") != std::string::npos;
    return isFile ? file((folder / nameOrFile).lexically_normal()) : builtIn(nameOrFile);
}

struct Layer {
    Source source;
    Json document;
};

std::string readSummary(const JsonNode& node) {
    std::string summary = node.asText();
    if (std::any_of(summary.begin(), summary.end(), isControl)) {
        node.fail("not one line");
    }
    return summary;
}

constexpr JsonKey<DeviceProfile> kProfileKeys[] = {
    {"$schema", [](const JsonNode& node, DeviceProfile& /*device*/) { node.asText(); }},
    {"summary",
     [](const JsonNode& node, DeviceProfile& device) { device.summary = readSummary(node); }},
    {"extends", [](const JsonNode& node, DeviceProfile& /*device*/) { node.asText(); }},
    {"capture",
     [](const JsonNode& node, DeviceProfile& device) { readCapture(node, device.capture); }},
    {"counters",
     [](const JsonNode& node, DeviceProfile& device) { readCounters(node, device.meterix); }},
    {"hid", [](const JsonNode& node, DeviceProfile& device) { readHid(node, device.hid); }},
    {"display",
     [](const JsonNode& node, DeviceProfile& device) { readDisplay(node, device.display); }},
};

// The profile and those that it extends, each before the one that it extends. `at` is the name of the
// document that is being read.
std::vector<Layer> readLayers(const std::string& nameOrFile, std::string& at) {
    std::vector<Layer> layers;
    Source source = findSource(nameOrFile, {});
    while (true) {
        at = source.name;
        Json document = parseJson(source.text);
        layers.push_back({std::move(source), std::move(document)});
        const JsonNode root(layers.back().document);
        if (!root.isObject() || !root.json().contains("extends")) {
            return layers;
        }
        const JsonNode base = root["extends"];
        const std::string name = base.asText();
        try {
            source = findSource(name, layers.back().source.folder);
        } catch (const DocumentProblem& problem) {
            base.fail(problem.what());
        }
        if (std::any_of(layers.begin(), layers.end(),
                        [&](const Layer& layer) { return layer.source.isSame(source); })) {
            base.fail(source.name + " extends itself");
        }
        if (layers.size() == kLongestChain) {
            base.fail("more than " + std::to_string(kLongestChain) + " profiles in a row");
        }
    }
}

}  // namespace

std::vector<GalleryEntry> gallery() {
    std::vector<GalleryEntry> entries;
    for (const GalleryText& profile : galleryTexts()) {
        const Json document = parseJson(std::string(profile.text));
        entries.push_back({std::string(profile.name), document.value("summary", "")});
    }
    return entries;
}

std::optional<DeviceProfile> loadProfile(const std::string& nameOrFile, std::string& problem) {
    std::string at;
    try {
        std::vector<Layer> layers = readLayers(nameOrFile, at);
        std::reverse(layers.begin(), layers.end());
        DeviceProfile device;
        for (const Layer& layer : layers) {
            at = layer.source.name;
            device.summary.clear();
            readObject(JsonNode(layer.document), kProfileKeys, device);
        }
        device.name = nameOrFile;
        return device;
    } catch (const DocumentProblem& found) {
        problem = (at.empty() ? "" : at + ": ") + found.what();
        std::replace_if(problem.begin(), problem.end(), isControl, '?');
        return std::nullopt;
    }
}

}  // namespace simulator
