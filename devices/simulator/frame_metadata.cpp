#include "devices/simulator/frame_metadata.h"

#include <algorithm>
#include <cmath>
#include <utility>

#include "platform/welkin/capture.h"

namespace simulator {

namespace {

constexpr double kWarmUpSeconds = 60;
constexpr std::string_view kNoDictionary = "corrupt";

bool covers(const FrameOverride& range, std::uint64_t frame) {
    return range.firstFrame <= frame && frame <= range.lastFrame;
}

// A number in [0, 1) that depends on nothing else (splitmix64).
double chance(std::uint64_t seed, std::uint64_t frame) {
    std::uint64_t bits = seed + frame * 0x9E3779B97F4A7C15U;
    bits = (bits ^ (bits >> 30U)) * 0xBF58476D1CE4E5B9U;
    bits = (bits ^ (bits >> 27U)) * 0x94D049BB133111EBU;
    bits ^= bits >> 31U;
    return static_cast<double>(bits >> 11U) / static_cast<double>(1ULL << 53U);
}

void applyOverride(const FrameOverride& range, platform::MutableDictionary& metadata) {
    for (const auto& [key, value] : range.set) {
        metadata.set(key, value);
    }
    for (const std::string& key : range.remove) {
        metadata.remove(key);
    }
}

}  // namespace

bool isDropped(const StreamProfile& profile, std::uint64_t frame) {
    return std::any_of(
        profile.overrides.begin(), profile.overrides.end(),
        [&](const FrameOverride& range) { return range.dropped && covers(range, frame); });
}

platform::Value frameMetadata(const StreamProfile& profile, std::uint64_t frame, double seconds) {
    platform::MutableDictionary metadata = profile.metadata;
    if (!profile.lightSources.empty()) {
        metadata.set(kRylCaptureStreamMetadata_InfraredLightSource,
                     profile.lightSources[(frame - 1) % profile.lightSources.size()]);
    }
    const double warmth = 1.0 - std::exp(-seconds / kWarmUpSeconds);
    for (const auto& [key, rise] : profile.warming) {
        if (const platform::Value* cold = metadata.find(key)) {
            const double warm = cold->asNumber().asDouble() + rise * warmth;
            metadata.set(key, std::round(warm * 100) / 100);
        }
    }
    for (const FrameOverride& range : profile.overrides) {
        if (!covers(range, frame)) {
            continue;
        }
        if (range.noMetadata) {
            return {};
        }
        if (range.metadataIsNoDictionary) {
            return kNoDictionary;
        }
        applyOverride(range, metadata);
    }
    return platform::Dictionary(std::move(metadata));
}

double frameDelay(const StreamProfile& profile, std::uint64_t frame) {
    return profile.jitterMicroseconds * 1e-6 * chance(profile.seed, frame);
}

}  // namespace simulator
