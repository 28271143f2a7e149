// SPDX-License-Identifier: Apache-2.0
#include "wire/Mailbox.h"

#include <sys/eventfd.h>
#include <unistd.h>

#include <cerrno>
#include <system_error>
#include <utility>

namespace keepsakes {

namespace {

int openEvent() {
    const int descriptor = eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK);
    if (descriptor < 0) throw std::system_error(errno, std::generic_category(), "eventfd");
    return descriptor;
}

}  // namespace

Mailbox::Mailbox() : descriptor_(openEvent()) {}
Mailbox::~Mailbox() { ::close(descriptor_); }

void Mailbox::post(Letter letter) {
    const std::lock_guard lock(mutex_);
    if (closed_) return;
    letters_.push_back(std::move(letter));
    // Fails only when the counter is full, and then the descriptor is readable anyway.
    if (letters_.size() == 1) eventfd_write(descriptor_, 1);
}

std::vector<Mailbox::Letter> Mailbox::take() {
    const std::lock_guard lock(mutex_);
    eventfd_t ignored = 0;
    if (!letters_.empty()) eventfd_read(descriptor_, &ignored);
    return std::exchange(letters_, {});
}

void Mailbox::close() {
    std::vector<Letter> dropped;
    const std::lock_guard lock(mutex_);
    closed_ = true;
    dropped.swap(letters_);
}

}  // namespace keepsakes
