// zr_linux_calls frames FRAMES PER_SECOND
// zr_linux_calls reports REPORTS
//
// The peer of zr_linux_device: the system calls that the same numbers take, and nothing else. It knows the virtual
// machine's nodes, its files and where each number stands, and ends with the first call that fails.
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <deque>
#include <linux/videodev2.h>
#include <vector>

#include <fcntl.h>
#include <linux/hidraw.h>
#include <poll.h>
#include <sys/ioctl.h>
#include <sys/mman.h>
#include <unistd.h>

#include "benchmarks/programs/item_costs.h"

namespace {

constexpr std::uint32_t kBuffers = 4;
constexpr std::uint32_t kPicture = V4L2_BUF_TYPE_VIDEO_CAPTURE;
constexpr std::uint32_t kMetadata = V4L2_BUF_TYPE_META_CAPTURE;

// What the call returned.
int must(const char* what, int result) {
    if (result < 0) {
        std::fprintf(stderr, "zr_linux_calls: %s: %s\n", what, std::strerror(errno));
        std::exit(1);
    }
    return result;
}

v4l2_buffer bufferOf(std::uint32_t type, std::uint32_t index = 0) {
    v4l2_buffer buffer{};
    buffer.index = index;
    buffer.type = type;
    buffer.memory = V4L2_MEMORY_MMAP;
    return buffer;
}

void queue(int node, std::uint32_t type, std::uint32_t index) {
    v4l2_buffer buffer = bufferOf(type, index);
    must("VIDIOC_QBUF", ioctl(node, VIDIOC_QBUF, &buffer));
}

bool dequeue(int node, v4l2_buffer& buffer) {
    const int result = ioctl(node, VIDIOC_DQBUF, &buffer);
    return result >= 0 || (errno != EAGAIN && must("VIDIOC_DQBUF", result) >= 0);
}

std::vector<const unsigned char*> makeBuffers(int node, std::uint32_t type) {
    v4l2_requestbuffers request{};
    request.count = kBuffers;
    request.type = type;
    request.memory = V4L2_MEMORY_MMAP;
    must("VIDIOC_REQBUFS", ioctl(node, VIDIOC_REQBUFS, &request));
    std::vector<const unsigned char*> contents;
    for (std::uint32_t index = 0; index < request.count; ++index) {
        if (type == kMetadata) {
            v4l2_buffer buffer = bufferOf(type, index);
            must("VIDIOC_QUERYBUF", ioctl(node, VIDIOC_QUERYBUF, &buffer));
            void* memory =
                mmap(nullptr, buffer.length, PROT_READ, MAP_SHARED, node, buffer.m.offset);
            must("mmap", memory == MAP_FAILED ? -1 : 0);
            contents.push_back(static_cast<const unsigned char*>(memory));
        }
        queue(node, type, index);
    }
    return contents;
}

void setUp(int video, int perSecond) {
    v4l2_format format{};
    format.type = kPicture;
    format.fmt.pix.width = 320;
    format.fmt.pix.height = 180;
    format.fmt.pix.pixelformat = V4L2_PIX_FMT_GREY;
    must("VIDIOC_S_FMT", ioctl(video, VIDIOC_S_FMT, &format));
    v4l2_streamparm parameters{};
    parameters.type = kPicture;
    parameters.parm.capture.timeperframe = {1, static_cast<std::uint32_t>(perSecond)};
    must("VIDIOC_S_PARM", ioctl(video, VIDIOC_S_PARM, &parameters));
}

std::uint32_t controlNamed(int video, const char* name) {
    v4l2_query_ext_ctrl query{};
    do {
        query.id |= V4L2_CTRL_FLAG_NEXT_CTRL;
        must(name, ioctl(video, VIDIOC_QUERY_EXT_CTRL, &query));
    } while (std::strcmp(query.name, name) != 0);
    return query.id;
}

// The numbers that do not come with a frame, each read as often as the description asks for.
struct SlowNumbers {
    int video;
    std::uint32_t control;
    int temperatureFile;
    double temperature = 0;
    double power = 0;
    std::uint64_t temperatureUntil = 0;
    std::uint64_t powerUntil = 0;

    void read() {
        const std::uint64_t now = timeOf(CLOCK_MONOTONIC);
        if (now >= temperatureUntil) {
            char text[32] = {};
            must("temp1_input", static_cast<int>(pread(temperatureFile, text, sizeof text - 1, 0)));
            temperature = std::strtod(text, nullptr) / 1000;
            temperatureUntil = now + 500'000'000;
        }
        if (now >= powerUntil) {
            v4l2_ext_control value{};
            value.id = control;
            v4l2_ext_controls values{};
            values.count = 1;
            values.controls = &value;
            must("VIDIOC_G_EXT_CTRLS", ioctl(video, VIDIOC_G_EXT_CTRLS, &values));
            power = value.value;
            powerUntil = now + 200'000'000;
        }
    }
};

// A frame's numbers; those that the description makes constant cost nothing.
struct Numbers {
    std::int64_t microseconds;
    double light, events, index, mode, temperature = 0, power = 0;
};

std::int64_t timeOfBuffer(const v4l2_buffer& buffer) {
    return std::int64_t{buffer.timestamp.tv_sec} * 1'000'000 + buffer.timestamp.tv_usec;
}

void stream(unsigned long frames, int perSecond) {
    ItemCosts costs(frames);
    const int video = must("video10", open("/dev/video10", O_RDWR | O_NONBLOCK));
    const int metadata = must("video11", open("/dev/video11", O_RDWR | O_NONBLOCK));
    setUp(video, perSecond);
    SlowNumbers slow{
        .video = video,
        .control = controlNamed(video, "Integer 32 Bits"),
        .temperatureFile = must("hwmon0", open("/sys/class/hwmon/hwmon0/temp1_input", O_RDONLY))};
    const auto contents = makeBuffers(metadata, kMetadata);
    makeBuffers(video, kPicture);
    must("VIDIOC_STREAMON", ioctl(metadata, VIDIOC_STREAMON, &kMetadata));
    must("VIDIOC_STREAMON", ioctl(video, VIDIOC_STREAMON, &kPicture));
    std::deque<Numbers> waiting;
    std::deque<v4l2_buffer> pictures;
    std::uint64_t lost = 0;
    std::uint32_t next = 0;
    for (bool hasFirst = false, isOver = false; !isOver;) {
        pollfd waits[] = {{video, POLLIN, 0}, {metadata, POLLIN, 0}};
        must("poll", poll(waits, 2, -1));
        for (v4l2_buffer buffer = bufferOf(kMetadata); dequeue(metadata, buffer);) {
            const unsigned char* bytes = contents[buffer.index];
            waiting.push_back({.microseconds = timeOfBuffer(buffer),
                               .light = static_cast<double>(bytes[11] >> 2 & 1),
                               .events = 8192 - 8192.0 * (bytes[11] >> 3 & 1),
                               .index = static_cast<double>(bytes[11] & 1),
                               .mode = static_cast<double>(bytes[10])});
            queue(metadata, kMetadata, buffer.index);
        }
        for (v4l2_buffer buffer = bufferOf(kPicture); dequeue(video, buffer);) {
            lost += hasFirst ? buffer.sequence - next : 0;
            next = buffer.sequence + 1;
            hasFirst = true;
            pictures.push_back(buffer);
        }
        while (!pictures.empty() && !waiting.empty()) {
            const v4l2_buffer picture = pictures.front();
            Numbers numbers = waiting.front();
            const std::int64_t ahead = numbers.microseconds - timeOfBuffer(picture);
            if (ahead == 0) {
                slow.read();
                numbers.temperature = slow.temperature;
                numbers.power = slow.power;
                must("a frame without light", numbers.light == 1 ? 0 : -1);
                isOver = costs.count() || isOver;
            }
            if (ahead <= 0) {
                waiting.pop_front();
            }
            if (ahead >= 0) {
                pictures.pop_front();
                queue(video, kPicture, picture.index);
            }
        }
    }
    costs.print(lost);
}

void read(unsigned long reports) {
    ItemCosts costs(reports);
    const int sensor = must("hidraw0", open("/dev/hidraw0", O_RDWR));
    for (const unsigned char id : {171, 172}) {
        unsigned char report[] = {id, 1};
        must("HIDIOCSFEATURE", ioctl(sensor, HIDIOCSFEATURE(sizeof report), report));
    }
    std::uint32_t first = 0;
    std::uint32_t last = 0;
    unsigned char report[792];
    do {
        must("read", static_cast<int>(::read(sensor, report, sizeof report)));
        std::memcpy(&last, report + 4, sizeof last);
        first = first == 0 ? last : first;
    } while (!costs.count(latencyOf(report)));
    costs.print(last - first + 1 - costs.seen());
}

}  // namespace

int main(int count, char** arguments) {
    const bool isStream = count == 4 && std::strcmp(arguments[1], "frames") == 0;
    const bool isSensor = count == 3 && std::strcmp(arguments[1], "reports") == 0;
    const unsigned long items = isStream || isSensor ? std::strtoul(arguments[2], nullptr, 10) : 0;
    if (items == 0) {
        std::fprintf(stderr,
                     "usage: zr_linux_calls frames FRAMES PER_SECOND\n"
                     "       zr_linux_calls reports REPORTS\n");
        return 64;
    }
    if (isStream) {
        stream(items, std::atoi(arguments[3]));
    } else {
        read(items);
    }
    return 0;
}
