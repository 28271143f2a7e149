// SPDX-License-Identifier: Apache-2.0
#include "daemon/MainLoop.h"

#include <fmt/format.h>
#include <poll.h>
#include <pthread.h>
#include <sys/eventfd.h>
#include <sys/signalfd.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdint>
#include <system_error>

#include "core/Log.h"

namespace keepsakes {

MainLoop::MainLoop() {
    std::signal(SIGPIPE, SIG_IGN);
    sigset_t taken;
    sigemptyset(&taken);
    for (const int signal : {SIGTERM, SIGINT, SIGUSR1}) sigaddset(&taken, signal);
    pthread_sigmask(SIG_BLOCK, &taken, nullptr);
    signals_ = ::signalfd(-1, &taken, SFD_CLOEXEC | SFD_NONBLOCK);
    wake_ = ::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK);
    if (signals_ < 0 || wake_ < 0) {
        throw std::system_error(errno, std::generic_category(), "main loop");
    }
}

MainLoop::~MainLoop() {
    ::close(signals_);
    ::close(wake_);
}

void MainLoop::watch(int descriptor, std::function<void()> handler) {
    watches_.emplace_back(descriptor, std::move(handler));
}

int MainLoop::run() {
    std::vector<pollfd> sources = {{signals_, POLLIN, 0}, {wake_, POLLIN, 0}};
    const auto firstWatch = sources.size();
    for (const auto& [descriptor, handler] : watches_) sources.push_back({descriptor, POLLIN, 0});
    while (status_ < 0) {
        if (::poll(sources.data(), sources.size(), -1) < 0 && errno != EINTR) return 1;
        if (sources[0].revents != 0) takeSignal();
        for (std::size_t index = 0; index < watches_.size(); ++index) {
            if (sources[firstWatch + index].revents != 0) watches_[index].second();
        }
    }
    return status_;
}

void MainLoop::takeSignal() {
    signalfd_siginfo info{};
    if (::read(signals_, &info, sizeof info) != sizeof info) return;
    if (info.ssi_signo == SIGUSR1) {
        report_();
        return;
    }
    logInfo(fmt::format("ending on signal {}", info.ssi_signo));
    stop(0);
}

void MainLoop::stop(int status) {
    int none = -1;
    status_.compare_exchange_strong(none, status);
    const std::uint64_t one = 1;
    if (::write(wake_, &one, sizeof one) < 0) return;  // full means that it is awake already
}

}  // namespace keepsakes
