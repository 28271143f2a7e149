// SPDX-License-Identifier: Apache-2.0
#include "support/MockService.h"

#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <cstdlib>
#include <stdexcept>
#include <utility>

namespace keepsakes {

namespace {

void run(const std::string& command) {
    if (std::system(command.c_str()) != 0) throw std::runtime_error("failed: " + command);
}

}  // namespace

void MockService::useSessionBusAsSystemBus() {
    const char* address = std::getenv("DBUS_SESSION_BUS_ADDRESS");
    if (!address) throw std::runtime_error("there is no private bus");
    ::setenv("DBUS_SYSTEM_BUS_ADDRESS", address, 1);
}

MockService::MockService(std::string templateName, std::string parameters, std::string name,
                         std::string path)
    : template_(std::move(templateName)),
      parameters_(std::move(parameters)),
      name_(std::move(name)),
      path_(std::move(path)) {}

MockService::~MockService() { end(); }

void MockService::start() {
    child_ = ::fork();
    if (child_ == 0) {
        ::execl("/usr/bin/python3", "python3", "-m", "dbusmock", "--session", "--logfile",
                "/dev/null", "--template", template_.c_str(), "--parameters", parameters_.c_str(),
                nullptr);
        ::_exit(127);
    }
    run("gdbus wait --session --timeout 30 " + name_);
}

void MockService::end() {
    if (child_ == 0) return;
    ::kill(child_, SIGKILL);
    ::waitpid(std::exchange(child_, 0), nullptr, 0);
}

void MockService::pause() const {
    ::kill(child_, SIGSTOP);
    int status = 0;
    ::waitpid(child_, &status, WUNTRACED);
}
void MockService::resume() const { ::kill(child_, SIGCONT); }

void MockService::call(const std::string& path, const std::string& method,
                       const std::string& arguments) const {
    run("gdbus call --session --timeout 30 -d " + name_ + " -o " + path + " -m " + method + ' ' +
        arguments + " >/dev/null");
}

void MockLogind::startWithUser() {
    sessions_.clear();
    start();
    // The template's own GetUser expects a text.
    mock("AddMethod",
         "org.freedesktop.login1.Manager GetUser u o "
         "'ret = \"/org/freedesktop/login1/user/%d\" % args[0]'");
    mock("AddUser", std::to_string(::getuid()) + " owner true");
}

std::string MockLogind::userPath() {
    return "/org/freedesktop/login1/user/" + std::to_string(::getuid());
}

void MockLogind::addSession(const std::string& session, bool active, bool locked) {
    // Not the template's AddSession, whose sessions are unlocked at first.
    const auto word = [](bool yes) { return yes ? "true" : "false"; };
    mock("AddObject", sessionPath(session) + " org.freedesktop.login1.Session \"{'LockedHint': <" +
                          word(locked) + ">, 'Active': <" + word(active) +
                          ">}\" \"[('Lock', '', '', 'self.EmitSignal(\\\"\\\", \\\"Lock\\\", "
                          "\\\"\\\", [])'), ('Unlock', '', '', 'self.EmitSignal(\\\"\\\", "
                          "\\\"Unlock\\\", \\\"\\\", [])')]\"");
    sessions_.push_back(session);
    tellOfSessions();
}

void MockLogind::removeSession(const std::string& session) {
    std::erase(sessions_, session);
    mock("RemoveObject", sessionPath(session));
    tellOfSessions();
}

void MockLogind::setLocked(const std::string& session, bool locked) const {
    update(sessionPath(session), "org.freedesktop.login1.Session",
           locked ? "{'LockedHint': <true>}" : "{'LockedHint': <false>}");
}

void MockLogind::setDisplay(const std::string& session) const {
    setUserProperty("Display", reference(session));
}

void MockLogind::setUserProperty(const std::string& name, const std::string& value) const {
    call(userPath(), "org.freedesktop.DBus.Properties.Set",
         "org.freedesktop.login1.User " + name + " \"<" + value + ">\"");
}

void MockLogind::tellOfSessions() const {
    std::string list;
    for (const auto& session : sessions_) list += (list.empty() ? "" : ", ") + reference(session);
    setUserProperty("Sessions", "@a(so) [" + list + "]");
}

}  // namespace keepsakes
