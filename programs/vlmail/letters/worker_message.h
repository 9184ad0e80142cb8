#pragma once
// What a worker hands over: numbers in the machine's order and byte strings behind their lengths.

#include "vlservice/pack/shared_mem_buffer.h"

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <string>
#include <string_view>
#include <utility>

namespace VlMail {

/// Taken out in the order in which it was put in.
class WorkerMessage {
public:
    WorkerMessage() = default;
    explicit WorkerMessage(std::string bytes) : bytes_(std::move(bytes)) {}

    void put(std::uint64_t number) { bytes_.append(reinterpret_cast<char const*>(&number), sizeof number); }
    void put(void const* data, std::size_t size) {
        put(size);
        bytes_.append(static_cast<char const*>(data), size);
    }
    void put(std::string_view text) { put(text.data(), text.size()); }
    void put(SharedMemBuffer const& buffer) { put(buffer.data(), buffer.size()); }

    std::uint64_t number() {
        std::uint64_t number = 0;
        std::memcpy(&number, bytes_.data() + at_, sizeof number);
        at_ += sizeof number;
        return number;
    }
    int smallNumber() { return static_cast<int>(number()); }
    /// The next byte string, valid as long as the message.
    std::string_view bytes() {
        std::size_t const size = number();
        at_ += size;
        return {bytes_.data() + at_ - size, size};
    }
    std::string text() { return std::string(bytes()); }
    /// The empty buffer for no bytes.
    SharedMemBuffer buffer() {
        std::string_view const data = bytes();
        return data.empty() ? SharedMemBuffer() : SharedMemBuffer::copyOf(data.data(), data.size());
    }
    std::string take() { return std::move(bytes_); }

private:
    std::string bytes_;
    std::size_t at_ = 0;
};

} // namespace VlMail
