// The operations of a device's interfaces, as recordings name them.
#ifndef ZR_DEVICES_RECORDING_OPERATION_H
#define ZR_DEVICES_RECORDING_OPERATION_H

#include <cstdint>
#include <string>
#include <string_view>

#include "platform/value.h"

namespace recording {

// The numbers are those of the file: append only.
//
//   operation           arguments                        result
//   Device              none                             the device's number, or absent
//   Streams             none                             a list of numbers, absent for a null entry; or absent
//   RequestControl      a list of the streams' numbers   boolean
//   Invalidate          none                             boolean
//   ValueForProperty    the property                     the value
//   SetValue            [property, value]                boolean
//   Start, Stop         none                             boolean
//   SimpleChannels      none                             a list of channels, each [group, subgroup, name]
//   Sample              a list of channels               a list of [channel, count]; or absent
//   Difference          [later, baseline], counts only   the same
//   CreateManager       none                             the manager's number, or absent
//   Enumerate           a list of dictionaries           absent
//   Devices             none                             a list of numbers
//   Open, Close         none                             boolean
//   SetCallback         whether there is one             absent
//   SetFeatureReport    [report ID, data]                boolean
//   Schedule            the mode                         absent
//   Unschedule          the mode                         absent
//   MainDisplay         none                             [status, display]
//   RegistryObject      the display                      the object
//   Property            [object, name]                   the value
//
// Handlers, and other objects in a value, are written as the text "(object)".
enum class Operation : std::uint8_t {
    Device,
    Streams,
    RequestControl,
    Invalidate,
    ValueForProperty,
    SetValue,
    Start,
    Stop,
    SimpleChannels,
    Sample,
    Difference,
    CreateManager,
    Enumerate,
    Devices,
    Open,
    Close,
    SetCallback,
    SetFeatureReport,
    Schedule,
    Unschedule,
    MainDisplay,
    RegistryObject,
    Property,
};
inline constexpr std::size_t kOperations = static_cast<std::size_t>(Operation::Property) + 1;

// "setValue".
std::string_view nameOf(Operation operation);

// The value with "(object)" in the place of every object.
platform::Value withoutObjects(const platform::Value& value);

// A call as texts name it: "setValue(ryl.stream.format-index, 0)". Calls with the same text are the same to a
// replay, so nothing of the arguments is left out.
std::string callText(Operation operation, const platform::Value& arguments);

}  // namespace recording

#endif
