// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>
#include <mutex>
#include <vector>

namespace keepsakes {

class BusLoop;

/// What other threads hand to the bus thread, first in, first out. Shared by the loop and by every
/// reply that is still open; what is posted after `close` is dropped. Any thread may call it.
/// Private to the folder.
class Mailbox {
  public:
    using Letter = std::function<void(BusLoop&)>;

    Mailbox();
    ~Mailbox();
    Mailbox(const Mailbox&) = delete;
    Mailbox& operator=(const Mailbox&) = delete;

    /// An eventfd, readable while there is something to take.
    int descriptor() const { return descriptor_; }

    void post(Letter letter);
    std::vector<Letter> take();
    void close();

  private:
    const int descriptor_;
    std::mutex mutex_;
    std::vector<Letter> letters_;
    bool closed_ = false;
};

}  // namespace keepsakes
