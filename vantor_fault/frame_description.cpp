#include "vantor_fault/frame_description.h"

#include <sstream>

#include "platform/text_format.h"

ZRVantorFrameDescription::ZRVantorFrameDescription() {
    _numbers.fill(0);
    _numbers[Column::FloodActiveTemperature] = Number();
}

std::shared_ptr<ZRVantorFrameDescription> ZRVantorFrameDescription::descriptionWithMonotonicCount(
    std::uint64_t monotonicCount,
    platform::MediaTime presenationTime,
    const platform::Dictionary& metadata) {
    auto description = std::make_shared<ZRVantorFrameDescription>();
    description->_monotonicCount = monotonicCount;
    description->_presentationTime = presenationTime;
    for (std::size_t column = 0; column < std::size(kSources); ++column) {
        const Number number = metadata.number(kSources[column].key);
        if (!number.isPresent() && kSources[column].required) {
            return nullptr;
        }
        description->_numbers[column] = number;
    }
    return description;
}

bool ZRVantorFrameDescription::safetyDisabledProjection() const {
    constexpr std::uint16_t kSafetyBit = 0x2000;
    // By way of 64 bits, so that a floating-point value loses its high bits too.
    return (static_cast<std::uint16_t>(hardwareEvents().as<std::int64_t>()) & kSafetyBit) != 0;
}

std::string ZRVantorFrameDescription::description() const {
    std::ostringstream base;
    base << "<ZRVantorFrameDescription: " << this << '>';
    return platform::format("%@ monotonic count: %@ illuminated: %@", base.str(), _monotonicCount,
                            infraredLightSource());
}

std::string ZRVantorFrameDescription::csvRepresentation() const {
    std::string row =
        platform::format("%@,%@,%lf", _monotonicCount, _creationDate, _presentationTime.seconds());
    for (const Number& number : _numbers) {
        row += ',';
        row += number.text();
    }
    row += '\n';
    return row;
}

std::string ZRVantorFrameDescription::csvRepresentationHeader() {
    std::string header = "Frame,Date,MediaTime(s)";
    for (const Source& source : kSources) {
        header += ',';
        header += source.key.text();
    }
    header += '\n';
    return header;
}
