#include "tests/virtual_machine/usb_device.h"

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstdio>
#include <string>

#include <arpa/inet.h>
#include <fcntl.h>
#include <sys/socket.h>
#include <unistd.h>

namespace guest {

namespace {

using namespace std::chrono_literals;

constexpr const char* kAttach = "/sys/devices/platform/vhci_hcd.0/attach";
constexpr int kAttempts = 100;
constexpr std::uint32_t kSubmit = 1;
constexpr std::uint32_t kUnlink = 2;
constexpr std::uint32_t kSubmitted = 3;
constexpr std::uint32_t kUnlinked = 4;
constexpr std::uint8_t kRead = 0x80;

bool attach(int socket) {
    const std::string line =
        "0 " + std::to_string(socket) + " 2 3";  // port, socket, id, high speed
    for (int attempt = 0; attempt < kAttempts; ++attempt) {
        const int file = open(kAttach, O_WRONLY);
        const bool isAttached = file >= 0 && write(file, line.data(), line.size()) > 0;
        close(file);
        if (isAttached) {
            return true;
        }
        std::this_thread::sleep_for(20ms);  // the port is not free yet
    }
    return false;
}

}  // namespace

void append(Bytes& bytes, std::uint64_t number, std::size_t count) {
    for (std::size_t at = 0; at < count; ++at) {
        bytes.push_back(static_cast<std::uint8_t>(number >> (8 * at)));
    }
}

void append(Bytes& bytes, std::span<const std::uint8_t> more) {
    bytes.insert(bytes.end(), more.begin(), more.end());
}

bool UsbDevice::plug() {
    int ends[2];
    if (socketpair(AF_UNIX, SOCK_STREAM, 0, ends) != 0) {
        return false;
    }
    _socket = ends[0];
    _thread = std::thread([this] { _serve(); });
    const bool isAttached = attach(ends[1]);
    close(ends[1]);
    return isAttached;
}

void UsbDevice::unplug() {
    shutdown(_socket, SHUT_RDWR);
    _thread.join();
    close(_socket);
}

bool UsbDevice::complete(std::uint8_t endpoint, std::span<const std::uint8_t> data, int status) {
    Request request{};
    {
        const std::lock_guard lock(_mutex);
        auto& queue = _waiting[endpoint];
        if (queue.empty()) {
            return false;
        }
        request = queue.front();
        queue.pop_front();
    }
    _reply(request, status, data);
    return true;
}

std::size_t UsbDevice::room(std::uint8_t endpoint) {
    const std::lock_guard lock(_mutex);
    const auto& queue = _waiting[endpoint];
    return queue.empty() ? 0 : queue.front().length;
}

void UsbDevice::_serve() {
    std::array<std::uint32_t, 12> header{};
    const std::span bytes(reinterpret_cast<std::uint8_t*>(header.data()), sizeof header);
    while (_receive(bytes)) {
        const std::uint32_t command = ntohl(header[0]);
        if (command == kUnlink) {
            _unlink(ntohl(header[1]), ntohl(header[5]));
        } else if (command != kSubmit || !_submit(header)) {
            break;
        }
    }
    const std::lock_guard lock(_mutex);
    _waiting.clear();
}

bool UsbDevice::_submit(const std::array<std::uint32_t, 12>& header) {
    const bool isRead = header[3] != 0;
    const auto endpoint = static_cast<std::uint8_t>(ntohl(header[4]) | (isRead ? kRead : 0));
    const Request request{ntohl(header[1]), isRead, ntohl(header[6])};
    Bytes data(isRead ? 0 : request.length);
    if (!_receive(data)) {
        return false;
    }
    int status = -EINPROGRESS;
    Bytes answer;
    if ((endpoint & ~kRead) == 0) {
        const auto* setup = reinterpret_cast<const std::uint8_t*>(&header[10]);
        const auto word = [setup](std::size_t at) {
            return static_cast<std::uint16_t>(setup[at] | setup[at + 1] << 8);
        };
        status = control({setup[0], setup[1], word(2), word(4), std::move(data)}, answer);
    }
    if (status == -EINPROGRESS) {
        const std::lock_guard lock(_mutex);
        _waiting[endpoint].push_back(request);
        return true;
    }
    answer.resize(status == 0 ? std::min(answer.size(), request.length) : 0);
    _reply(request, status, answer);
    return true;
}

void UsbDevice::_unlink(std::uint32_t sequence, std::uint32_t victim) {
    std::size_t removed = 0;
    {
        const std::lock_guard lock(_mutex);
        for (auto& [endpoint, queue] : _waiting) {
            removed += std::erase_if(
                queue, [victim](const Request& request) { return request.sequence == victim; });
        }
    }
    const auto status = static_cast<std::uint32_t>(removed > 0 ? -ECONNRESET : 0);
    _send({htonl(kUnlinked), htonl(sequence), 0, 0, 0, htonl(status)}, {});
}

bool UsbDevice::_receive(std::span<std::uint8_t> bytes) const {
    while (!bytes.empty()) {
        const ssize_t count = read(_socket, bytes.data(), bytes.size());
        if (count <= 0) {
            return false;
        }
        bytes = bytes.subspan(static_cast<std::size_t>(count));
    }
    return true;
}

void UsbDevice::_reply(const Request& request, int status, std::span<const std::uint8_t> data) {
    const std::size_t length = request.isRead ? data.size() : request.length;
    _send({htonl(kSubmitted), htonl(request.sequence), 0, 0, 0,
           htonl(static_cast<std::uint32_t>(status)), htonl(static_cast<std::uint32_t>(length))},
          data);
}

void UsbDevice::_send(const std::array<std::uint32_t, 12>& header,
                      std::span<const std::uint8_t> data) {
    Bytes message(sizeof header);
    std::copy_n(reinterpret_cast<const std::uint8_t*>(header.data()), sizeof header,
                message.begin());
    append(message, data);
    const std::lock_guard lock(_sending);
    for (std::span<const std::uint8_t> rest(message); !rest.empty();) {
        const ssize_t count = send(_socket, rest.data(), rest.size(), MSG_NOSIGNAL);
        if (count <= 0) {
            return;  // unplugged
        }
        rest = rest.subspan(static_cast<std::size_t>(count));
    }
}

}  // namespace guest
