#pragma once

#include <unistd.h>

#include <utility>

namespace orva {

// Owns a file descriptor; closed at the end.
class FileDescriptor {
  public:
    FileDescriptor() = default;
    explicit FileDescriptor(int descriptor) : fd(descriptor) {}
    ~FileDescriptor() { Reset(); }
    FileDescriptor(FileDescriptor&& other) noexcept : fd(std::exchange(other.fd, -1)) {}
    FileDescriptor& operator=(FileDescriptor&& other) noexcept {
        if (this != &other) {
            Reset();
            fd = std::exchange(other.fd, -1);
        }
        return *this;
    }

    bool IsOpen() const { return fd >= 0; }
    int Get() const { return fd; }
    // Gives it up: the caller closes it.
    int Release() { return std::exchange(fd, -1); }

  private:
    void Reset() {
        if (fd >= 0) {
            ::close(fd);
        }
        fd = -1;
    }

    int fd = -1;
};

}  // namespace orva
