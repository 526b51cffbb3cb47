// A camera of eight buffers that delivers as fast as they come back, and the capture service over it: for
// runs of the fault experiment at full speed.
#ifndef ZR_TESTS_SUPPORT_HAND_FED_CAMERA_H
#define ZR_TESTS_SUPPORT_HAND_FED_CAMERA_H

#include <atomic>
#include <cstdint>
#include <functional>
#include <memory>
#include <semaphore>
#include <thread>
#include <utility>

#include "tests/support/one_stream_capture.h"

namespace test {

// Lends an image per frame on a thread of its own, at most eight at once, from start() to stop(). Its
// destructor waits for every buffer.
template <class Image>
class Camera {
  public:
    using Buffer = std::shared_ptr<const Image>;
    using Handler = std::function<void(const Buffer& buffer, platform::MediaTime time)>;
    // The image of a frame, from 1; null ends the delivery there. Called on the camera's thread.
    using Source = std::function<Buffer(std::int64_t frame)>;

    explicit Camera(Source source) : _source(std::move(source)) {}
    ~Camera() {
        stop();
        if (_thread.joinable()) {
            _thread.join();
        }
        for (std::ptrdiff_t buffer = 0; buffer < kBuffers; ++buffer) {
            _free.acquire();
        }
    }
    Camera(const Camera&) = delete;
    Camera& operator=(const Camera&) = delete;

    void start(Handler handler) {
        _thread = std::thread([this, handler = std::move(handler)] {
            for (std::int64_t frame = 1;; ++frame) {
                const Buffer image = _source(frame);
                _free.acquire();
                const Buffer buffer(image.get(), [this, image](const Image*) { _free.release(); });
                if (_stopped.load() || image == nullptr) {
                    return;
                }
                handler(buffer, {frame, 30, platform::MediaTime::kValid, 0});
            }
        });
    }
    // May be called on any thread, also while a handler runs. A buffer that is ready may still come.
    void stop() { _stopped.store(true); }

  private:
    static constexpr std::ptrdiff_t kBuffers = 8;

    const Source _source;
    std::counting_semaphore<kBuffers> _free{kBuffers};
    std::atomic<bool> _stopped{false};  // set on the thread that has seen enough
    std::thread _thread;
};

// The camera as a capture service. Ends with its last owner, which must not be a thread of the run: it waits
// for the camera.
class HandFedCapture : public OneStreamCapture {
  public:
    explicit HandFedCapture(Camera<platform::ImageBuffer>::Source source)
        : _camera(std::move(source)) {}

    bool start(platform::ErrorSlot /*error*/) override {
        _camera.start(frameHandler());
        return true;
    }
    bool stop(platform::ErrorSlot /*error*/) override {
        _camera.stop();
        return true;
    }

  private:
    Camera<platform::ImageBuffer> _camera;
};

}  // namespace test

#endif
