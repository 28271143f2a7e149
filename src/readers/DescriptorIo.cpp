// SPDX-License-Identifier: Apache-2.0
#include "readers/DescriptorIo.h"

#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <stdexcept>

#include "readers/ReaderLimits.h"

namespace keepsakes {

int DescriptorIo::open() {
    at_ = 0;
    ended_ = false;
    return 0;
}

Exiv2::DataBuf DescriptorIo::read(long count) {
    // A length that a file claims is not trusted with memory before the file is known to have it.
    Exiv2::DataBuf data(std::min(count, static_cast<long>(std::max<std::int64_t>(size_ - at_, 0))));
    data.size_ = read(data.pData_, data.size_);
    return data;
}

long DescriptorIo::read(Exiv2::byte* into, long count) {
    long done = 0;
    while (done < count) {
        const auto inBuffer = at_ - bufferStart_;
        const auto buffered = static_cast<std::int64_t>(buffer_.size()) - inBuffer;
        if (inBuffer >= 0 && buffered > 0) {
            const auto take = std::min<long>(count - done, buffered);
            std::memcpy(into + done, buffer_.data() + inBuffer, static_cast<std::size_t>(take));
            done += take;
            at_ += take;
            continue;
        }
        buffer_.resize(limits::kBlockSize);
        bufferStart_ = at_;
        const auto filled = readFile(buffer_.data(), static_cast<long>(buffer_.size()), at_);
        buffer_.resize(static_cast<std::size_t>(filled));
        if (filled == 0) {
            ended_ = true;
            break;
        }
    }
    return done;
}

int DescriptorIo::getb() {
    Exiv2::byte one = 0;
    return read(&one, 1) == 1 ? one : EOF;
}

int DescriptorIo::seek(long offset, Position from) {
    const std::int64_t base = from == beg ? 0 : from == cur ? at_ : size_;
    const auto target = base + offset;
    if (target < 0 || target > size_) return 1;
    at_ = target;
    ended_ = false;
    return 0;
}

Exiv2::byte* DescriptorIo::mmap(bool) { throw std::runtime_error("this kind of file is not read"); }

long DescriptorIo::readFile(Exiv2::byte* into, long count, std::int64_t offset) {
    while (true) {
        const auto filled = ::pread(fd_, into, static_cast<std::size_t>(count), offset);
        if (filled < 0 && errno == EINTR) continue;
        failed_ = failed_ || filled < 0;
        return std::max<long>(filled, 0);
    }
}

}  // namespace keepsakes
