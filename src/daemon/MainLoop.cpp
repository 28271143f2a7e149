// SPDX-License-Identifier: Apache-2.0
#include "daemon/MainLoop.h"

#include <fmt/format.h>
#include <poll.h>
#include <pthread.h>
#include <sys/eventfd.h>
#include <sys/signalfd.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <cstdint>
#include <system_error>

#include "core/Log.h"

namespace keepsakes {

MainLoop::MainLoop() {
    std::signal(SIGPIPE, SIG_IGN);
    sigset_t ending;
    sigemptyset(&ending);
    sigaddset(&ending, SIGTERM);
    sigaddset(&ending, SIGINT);
    pthread_sigmask(SIG_BLOCK, &ending, nullptr);
    signals_ = ::signalfd(-1, &ending, SFD_CLOEXEC | SFD_NONBLOCK);
    wake_ = ::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK);
    if (signals_ < 0 || wake_ < 0) {
        throw std::system_error(errno, std::generic_category(), "main loop");
    }
}

MainLoop::~MainLoop() {
    ::close(signals_);
    ::close(wake_);
}

int MainLoop::run() {
    std::array<pollfd, 2> sources = {{{signals_, POLLIN, 0}, {wake_, POLLIN, 0}}};
    while (status_ < 0) {
        if (::poll(sources.data(), sources.size(), -1) < 0 && errno != EINTR) return 1;
        signalfd_siginfo info{};
        if (::read(signals_, &info, sizeof info) == sizeof info) {
            logInfo(fmt::format("ending on signal {}", info.ssi_signo));
            stop(0);
        }
    }
    return status_;
}

void MainLoop::stop(int status) {
    int none = -1;
    status_.compare_exchange_strong(none, status);
    const std::uint64_t one = 1;
    if (::write(wake_, &one, sizeof one) < 0) return;  // full means that it is awake already
}

}  // namespace keepsakes
