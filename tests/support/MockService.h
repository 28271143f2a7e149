// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <sys/types.h>

#include <string>
#include <vector>

namespace keepsakes {

/// A system service played by python-dbusmock on the test's private bus, which stands for the
/// system bus as well. Ends with its owner.
class MockService {
  public:
    static constexpr const char* kMockInterface = "org.freedesktop.DBus.Mock.";

    /// Has the process take the test's session bus for the system bus.
    static void useSessionBusAsSystemBus();

    /// Plays one of dbusmock's templates, under the name and with the main object that it has.
    /// Parameters are the template's, in JSON.
    MockService(std::string templateName, std::string parameters, std::string name,
                std::string path);
    ~MockService();
    MockService(const MockService&) = delete;
    MockService& operator=(const MockService&) = delete;

    /// Returns when the service is on the bus.
    void start();
    /// Kills it.
    void end();
    /// It stays on the bus and answers nothing until `resume`.
    void pause() const;
    void resume() const;

    /// Calls a method of an object, of the main one by default; arguments as gdbus(1) takes them.
    void call(const std::string& path, const std::string& method,
              const std::string& arguments = "") const;
    /// A method of the mock itself, on its main object.
    void mock(const std::string& method, const std::string& arguments) const {
        call(path_, kMockInterface + method, arguments);
    }
    /// Sets properties, with one signal that tells of them.
    void update(const std::string& path, const std::string& interface,
                const std::string& properties) const {
        call(path, std::string(kMockInterface) + "UpdateProperties",
             interface + " \"" + properties + '"');
    }

  private:
    const std::string template_;
    const std::string parameters_;
    const std::string name_;
    const std::string path_;
    pid_t child_ = 0;
};

/// A device's power: on battery, though without any device at first.
class MockUPower final : public MockService {
  public:
    MockUPower()
        : MockService("upower", R"({"OnBattery": true})", "org.freedesktop.UPower",
                      "/org/freedesktop/UPower") {}

    static std::string devicePath(const std::string& name) {
        return "/org/freedesktop/UPower/devices/" + name;
    }
    void addDevice(const std::string& name, const std::string& properties) const {
        mock("AddObject", devicePath(name) + " org.freedesktop.UPower.Device \"{" + properties +
                              "}\" '@a(ssss) []'");
        tellOfDevices();
    }
    void addBattery(const std::string& name, int percent) const {
        const auto share = std::to_string(percent) + ".0";
        addDevice(name,
                  "'Type': <uint32 2>, 'PowerSupply': <true>, 'IsPresent': <true>, "
                  "'State': <uint32 2>, 'EnergyRate': <2.0>, 'Energy': <" +
                      share + ">, 'EnergyFull': <100.0>, 'Percentage': <" + share + ">");
    }
    void addLinePower(const std::string& nativePath, bool online) const {
        addDevice("line", std::string("'Type': <uint32 1>, 'PowerSupply': <true>, 'Online': <") +
                              (online ? "true" : "false") + ">, 'NativePath': <'" + nativePath +
                              "'>");
    }
    void updateDevice(const std::string& name, const std::string& properties) const {
        update(devicePath(name), "org.freedesktop.UPower.Device", '{' + properties + '}');
    }
    /// A sign of change, after which everything is read anew.
    void tellOfDevices() const {
        mock("EmitSignal",
             "org.freedesktop.UPower DeviceAdded o \"[<objectpath '/org/freedesktop/UPower'>]\"");
    }
};

/// A login manager that knows the test's own user, without any session at first.
class MockLogind final : public MockService {
  public:
    MockLogind()
        : MockService("logind", "{}", "org.freedesktop.login1", "/org/freedesktop/login1") {}

    void startWithUser();
    static std::string sessionPath(const std::string& session) {
        return "/org/freedesktop/login1/session/" + session;
    }
    void addSession(const std::string& session, bool active, bool locked);
    void removeSession(const std::string& session);
    void setLocked(const std::string& session, bool locked) const;
    void requestLock(const std::string& session) const {
        call(sessionPath(session), "org.freedesktop.login1.Session.Lock");
    }
    void requestUnlock(const std::string& session) const {
        call(sessionPath(session), "org.freedesktop.login1.Session.Unlock");
    }
    void setDisplay(const std::string& session) const;

  private:
    static std::string userPath();
    static std::string reference(const std::string& session) {
        return "('" + session + "', objectpath '" + sessionPath(session) + "')";
    }
    void setUserProperty(const std::string& name, const std::string& value) const;
    void tellOfSessions() const;

    std::vector<std::string> sessions_;
};

}  // namespace keepsakes
