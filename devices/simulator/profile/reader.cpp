#include "devices/simulator/profile/reader.h"

#include <algorithm>
#include <cstddef>
#include <filesystem>
#include <utility>

#include "devices/simulator/profile/gallery_text.h"
#include "devices/simulator/profile/parts.h"
#include "input/json_reader.h"
#include "input/nearest.h"
#include "input/text_file.h"

namespace simulator {

using input::DocumentProblem;
using input::Json;
using input::JsonNode;
using input::parseJson;

namespace {

constexpr std::size_t kLongestChain = 16;

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
    return {true, path.string(), path.parent_path(), input::readTextFile(path, "a profile")};
}

Source findSource(const std::string& nameOrFile, const std::filesystem::path& folder) {
    const bool isFile = nameOrFile.find_first_of("/.") != std::string::npos;
    return isFile ? file((folder / nameOrFile).lexically_normal()) : builtIn(nameOrFile);
}

struct Layer {
    Source source;
    Json document;
};

// What a profile that extends null starts from.
DeviceProfile bareDevice() {
    DeviceProfile device;
    device.capture.streams.clear();
    device.meterix.channels.clear();
    device.hid.devices.clear();
    return device;
}

// The profile and those that it extends, each before the one that it extends. `at` is the name of the
// document that is being read.
std::vector<Layer> readLayers(const std::string& nameOrFile, std::string& at) {
    std::vector<std::string> none;  // nothing is visited here
    std::vector<Layer> layers;
    Source source = findSource(nameOrFile, {});
    while (true) {
        at = source.name;
        Json document = parseJson(source.text);
        layers.push_back({std::move(source), std::move(document)});
        const JsonNode root(layers.back().document, none);
        if (!root.isObject() || root.json().value("extends", Json()).is_null()) {
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

std::optional<DeviceProfile> loadProfile(const std::string& nameOrFile,
                                         std::vector<std::string>& problems) {
    std::string at;
    std::vector<std::string> found;
    DeviceProfile device;
    try {
        std::vector<Layer> layers = readLayers(nameOrFile, at);
        std::reverse(layers.begin(), layers.end());
        for (auto layer = layers.begin(); layer != layers.end() && found.empty(); ++layer) {
            at = layer->source.name;
            if (layer->document.contains("extends") && layer->document["extends"].is_null()) {
                device = bareDevice();
            }
            device.summary.clear();
            readProfile(JsonNode(layer->document, found), device);
        }
    } catch (const DocumentProblem& problem) {
        found.emplace_back(problem.what());
    }
    for (std::string& problem : found) {
        problem.insert(0, at.empty() ? "" : at + ": ");
        problems.push_back(input::oneLine(std::move(problem)));
    }
    device.name = nameOrFile;
    return found.empty() ? std::optional(std::move(device)) : std::nullopt;
}

}  // namespace simulator
