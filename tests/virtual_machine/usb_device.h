// A USB device in user space, behind the kernel's virtual host controller (vhci-hcd): the kernel's own drivers drive
// it. The controller gets one end of a pair of sockets; this object speaks the USB/IP wire format on the other.
//
// Threads  control() is called on the object's own thread; the others may be called on any.
#ifndef ZR_TESTS_VIRTUAL_MACHINE_USB_DEVICE_H
#define ZR_TESTS_VIRTUAL_MACHINE_USB_DEVICE_H

#include <array>
#include <cstddef>
#include <cstdint>
#include <deque>
#include <map>
#include <mutex>
#include <span>
#include <thread>
#include <vector>

namespace guest {

using Bytes = std::vector<std::uint8_t>;

// Appends the number's lowest bytes, the lowest first.
void append(Bytes& bytes, std::uint64_t number, std::size_t count);
void append(Bytes& bytes, std::span<const std::uint8_t> more);

// The fields of a control request (USB 2.0, table 9-2), and the data of one that writes.
struct ControlRequest {
    std::uint8_t type;
    std::uint8_t request;
    std::uint16_t value;
    std::uint16_t index;
    Bytes data;
};

class UsbDevice {
  public:
    virtual ~UsbDevice() = default;

    // Attaches the device to the controller's first port; false when the controller refuses for two seconds.
    bool plug();
    void unplug();

    // Completes the oldest request that waits at the endpoint with data, or with a negative status; false when
    // none waits.
    bool complete(std::uint8_t endpoint, std::span<const std::uint8_t> data, int status = 0);

    // How many bytes the oldest request takes; 0 when none waits.
    std::size_t room(std::uint8_t endpoint);

  protected:
    // Answers with data in `answer`, or with a negative status: -EPIPE refuses, -EINPROGRESS never answers.
    virtual int control(const ControlRequest& request, Bytes& answer) = 0;

  private:
    struct Request {
        std::uint32_t sequence;
        bool isRead;
        std::size_t length;
    };

    void _serve();
    bool _submit(const std::array<std::uint32_t, 12>& header);
    void _unlink(std::uint32_t sequence, std::uint32_t victim);
    bool _receive(std::span<std::uint8_t> bytes) const;
    void _reply(const Request& request, int status, std::span<const std::uint8_t> data);
    void _send(const std::array<std::uint32_t, 12>& header, std::span<const std::uint8_t> data);

    int _socket = -1;
    std::thread _thread;
    std::mutex _sending;
    std::mutex _mutex;
    std::map<std::uint8_t, std::deque<Request>> _waiting;  // by endpoint; guarded by _mutex
};

}  // namespace guest

#endif
