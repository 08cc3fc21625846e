#pragma once

#include <unistd.h>

#include <utility>

namespace ipmisel {

/// An open file of the system, closed with the object.
class FileDescriptor {
public:
    FileDescriptor() = default;
    explicit FileDescriptor(int number) : number_(number) {}
    ~FileDescriptor() { Close(); }
    FileDescriptor(FileDescriptor&& other) noexcept : number_(std::exchange(other.number_, -1)) {}
    FileDescriptor& operator=(FileDescriptor&& other) noexcept {
        std::swap(number_, other.number_);
        return *this;
    }
    FileDescriptor(const FileDescriptor&) = delete;
    FileDescriptor& operator=(const FileDescriptor&) = delete;

    int get() const { return number_; }  ///< -1 for none
    bool IsOpen() const { return number_ >= 0; }
    void Close() {
        if (number_ >= 0) close(std::exchange(number_, -1));
    }

private:
    int number_ = -1;
};

}  // namespace ipmisel
