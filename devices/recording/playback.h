// Playback: makes recorded deliveries again, one after the other, when their time has come.
#ifndef ZR_DEVICES_RECORDING_PLAYBACK_H
#define ZR_DEVICES_RECORDING_PLAYBACK_H

#include <chrono>
#include <cstddef>
#include <functional>
#include <memory>
#include <thread>
#include <utility>

#include "devices/recording/script.h"
#include "platform/sync.h"

namespace recording {

// What came before the stop is delivered, all of it and no more, until stop() is called; what came after it is
// delivered once stopped() says that the stop is done. Nothing is invented to fill the time: a client that asks for
// more than was recorded waits.
//
// Owner    A stream or a sensor, and the playback's thread while there are deliveries left.
// Threads  Any; no lock is held while a delivery is made. Inside one, no operation waits for it.
class Playback : public std::enable_shared_from_this<Playback> {
  public:
    // Makes the delivery of that index, on the playback's thread.
    using Deliver = std::function<void(std::size_t index)>;

    // `deliveries` outlive the playback.
    Playback(const Deliveries& deliveries, double speed, Deliver deliver);
    Playback(const Playback&) = delete;
    Playback& operator=(const Playback&) = delete;
    ~Playback() = default;

    // Throws std::system_error when no thread can be started.
    void start();

    // Delivers at once what came before the stop and is not delivered yet, and waits for it.
    void stop();
    // The rest may come.
    void stopped();
    // Delivers at once what may still come, waits for it, and ends the playback.
    void finish();
    // Ends the playback; does not wait.
    void abandon();

  private:
    using TimePoint = std::chrono::steady_clock::time_point;

    void _play();
    bool _awaitTurn(std::size_t index);
    TimePoint _dueTime(std::size_t index) const ZR_REQUIRES(_mutex);
    void _hurry() ZR_REQUIRES(_mutex);

    const Deliveries& _deliveries;
    const double _speed;
    const Deliver _deliver;

    platform::Mutex _mutex;
    platform::Condition _changed;
    TimePoint _started ZR_GUARDED_BY(_mutex);
    TimePoint _stopped ZR_GUARDED_BY(_mutex);
    std::size_t _allowed ZR_GUARDED_BY(_mutex);      // deliveries below this index may be made
    std::size_t _hurried ZR_GUARDED_BY(_mutex) = 0;  // those below this one without waiting
    std::size_t _done ZR_GUARDED_BY(_mutex) = 0;
    bool _isOver ZR_GUARDED_BY(_mutex) = false;
    std::thread::id _thread ZR_GUARDED_BY(_mutex);
};

}  // namespace recording

#endif
