// Injector: counts the steps of one device and decides which of them fail.
#ifndef ZR_DEVICES_FAULTY_INJECTOR_H
#define ZR_DEVICES_FAULTY_INJECTOR_H

#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string_view>
#include <utility>
#include <vector>

#include "devices/faulty/fault.h"
#include "platform/sync.h"

namespace faulty {

inline constexpr Way kFails[] = {Way::WithError, Way::WithoutError};
inline constexpr Way kNoObject[] = {Way::AbsentObject};
inline constexpr Way kLost[] = {Way::Lost};

// Shared by everything that a faulty device is made of. Any thread.
class Injector {
  public:
    explicit Injector(std::vector<Fault> faults) : _faults(std::move(faults)) {}

    // Takes a step: numbers it, and returns how it fails, if it does.
    std::optional<Strike> take(StepKind kind,
                               std::string_view operation,
                               std::string_view detail,
                               std::span<const Way> ways);

    // A call of the device. When it fails, that is its caller's default value, and an error in the slot if
    // there is one; when it yields something wrong, damage(result, way) is.
    template <class Inner, class Damage>
    auto call(std::string_view operation,
              std::string_view detail,
              std::span<const Way> ways,
              platform::ErrorSlot error,
              Inner inner,
              Damage damage) -> decltype(inner()) {
        const auto strike = take(StepKind::Call, operation, detail, ways);
        if (!strike.has_value()) {
            return inner();
        }
        const Way way = strike->fault.way;
        if (way == Way::WithError || way == Way::WithoutError) {
            static_cast<void>(platform::failWith(error, strike->error));
            return {};
        }
        return damage(inner(), way);
    }
    // A call that can only fail.
    template <class Inner>
    auto call(std::string_view operation,
              std::string_view detail,
              platform::ErrorSlot error,
              Inner inner) -> decltype(inner()) {
        return call(operation, detail, kFails, error, inner,
                    [](auto result, Way /*way*/) { return result; });
    }
    // A call without a result; returns whether it gets through.
    bool passes(std::string_view operation) {
        return !take(StepKind::Call, operation, {}, kLost).has_value();
    }

    std::vector<Step> steps() const;
    std::vector<Strike> strikes() const;

  private:
    struct Taken {
        std::uint64_t count = 0;
        std::vector<Step> first;
    };
    static constexpr std::size_t kStepKinds = 5;

    const std::vector<Fault> _faults;

    mutable platform::Mutex _mutex;
    std::array<Taken, kStepKinds> _taken ZR_GUARDED_BY(_mutex);
    std::vector<Strike> _strikes ZR_GUARDED_BY(_mutex);
};

}  // namespace faulty

#endif
