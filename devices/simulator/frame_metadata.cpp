#include "devices/simulator/frame_metadata.h"

#include <algorithm>
#include <cmath>
#include <utility>

#include "devices/simulator/mix_bits.h"
#include "platform/welkin/capture.h"

namespace simulator {

namespace {

constexpr double kWarmUpSeconds = 60;
constexpr std::string_view kNoDictionary = "corrupt";

// The sensor's own count, which also counts the frames that are lost on the way. The plug-in does not
// read it; the bench finds lost frames by it.
constexpr std::string_view kFrameNumber = "FrameNumber";

// A number in [0, 1) that depends on nothing else.
double chance(std::uint64_t seed, std::uint64_t frame) {
    const std::uint64_t bits = mixBits(seed + frame * kSplitMixStep);
    return static_cast<double>(bits >> 11U) / static_cast<double>(1ULL << 53U);
}

void applyOverride(const FrameOverride& change, platform::MutableDictionary& metadata) {
    for (const auto& [key, value] : change.set) {
        metadata.set(key, value);
    }
    for (const std::string& key : change.remove) {
        metadata.remove(key);
    }
}

}  // namespace

bool isDropped(const StreamProfile& profile, std::uint64_t frame) {
    return std::any_of(
        profile.overrides.begin(), profile.overrides.end(),
        [&](const FrameOverride& change) { return change.dropped && change.frames.covers(frame); });
}

platform::Value frameMetadata(const StreamProfile& profile, std::uint64_t frame, double seconds) {
    platform::MutableDictionary metadata = profile.metadata;
    if (!profile.lightSources.empty()) {
        metadata.set(kRylCaptureStreamMetadata_InfraredLightSource,
                     profile.lightSources[(frame - 1) % profile.lightSources.size()]);
    }
    metadata.set(kFrameNumber, frame);
    const double warmth = 1.0 - std::exp(-seconds / kWarmUpSeconds);
    for (const auto& [key, rise] : profile.warming) {
        if (const platform::Value* cold = metadata.find(key)) {
            const double warm = cold->asNumber().asDouble() + rise * warmth;
            metadata.set(key, std::round(warm * 100) / 100);
        }
    }
    for (const FrameOverride& change : profile.overrides) {
        if (!change.frames.covers(frame)) {
            continue;
        }
        if (change.noMetadata) {
            return {};
        }
        if (change.metadataIsNoDictionary) {
            return kNoDictionary;
        }
        applyOverride(change, metadata);
    }
    return platform::Dictionary(std::move(metadata));
}

double frameDelay(const StreamProfile& profile, std::uint64_t frame) {
    return profile.jitterMicroseconds * 1e-6 * chance(profile.seed, frame);
}

}  // namespace simulator
