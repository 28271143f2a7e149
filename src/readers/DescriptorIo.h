// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <exiv2/exiv2.hpp>
#include <string>
#include <vector>

namespace keepsakes {

/// An open file as exiv2 reads one: by pread through a buffer, so that of a large photo only what
/// is looked at is read, and a file that shrinks meanwhile is a short read (a mapped one would be a
/// signal). Read-only: what would write answers failure. The descriptor stays the caller's.
class DescriptorIo final : public Exiv2::BasicIo {
  public:
    DescriptorIo(int fd, std::int64_t size) : fd_(fd), size_(size) {}

    int open() override;
    int close() override { return 0; }
    long write(const Exiv2::byte*, long) override { return 0; }
    long write(Exiv2::BasicIo&) override { return 0; }
    int putb(Exiv2::byte) override { return EOF; }
    Exiv2::DataBuf read(long count) override;
    long read(Exiv2::byte* into, long count) override;
    int getb() override;
    void transfer(Exiv2::BasicIo&) override {}
    int seek(long offset, Position from) override;
    Exiv2::byte* mmap(bool) override;
    int munmap() override { return 0; }
    long tell() const override { return at_; }
    std::size_t size() const override { return static_cast<std::size_t>(size_); }
    bool isopen() const override { return true; }
    int error() const override { return failed_ ? 1 : 0; }
    bool eof() const override { return ended_; }
    std::string path() const override { return "photo"; }

  private:
    long readFile(Exiv2::byte* into, long count, std::int64_t offset);

    int fd_;
    std::int64_t size_;
    std::int64_t at_ = 0;
    bool ended_ = false;
    bool failed_ = false;
    std::vector<Exiv2::byte> buffer_;
    std::int64_t bufferStart_ = 0;
};

}  // namespace keepsakes
