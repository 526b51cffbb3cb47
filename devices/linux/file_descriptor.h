// FileDescriptor: an open file, closed with its owner.
#ifndef ZR_DEVICES_LINUX_FILE_DESCRIPTOR_H
#define ZR_DEVICES_LINUX_FILE_DESCRIPTOR_H

#include <utility>

#include <unistd.h>

namespace linux_device {

class FileDescriptor {
  public:
    FileDescriptor() = default;
    explicit FileDescriptor(int number) : _number(number) {}
    FileDescriptor(FileDescriptor&& other) noexcept : _number(std::exchange(other._number, -1)) {}
    FileDescriptor& operator=(FileDescriptor&& other) noexcept {
        std::swap(_number, other._number);
        return *this;
    }
    FileDescriptor(const FileDescriptor&) = delete;
    FileDescriptor& operator=(const FileDescriptor&) = delete;
    ~FileDescriptor() {
        if (_number >= 0) {
            ::close(_number);
        }
    }

    int number() const { return _number; }  // negative when there is none
    bool isOpen() const { return _number >= 0; }

  private:
    int _number = -1;
};

}  // namespace linux_device

#endif
