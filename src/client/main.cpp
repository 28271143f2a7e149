// SPDX-License-Identifier: Apache-2.0
#include <CLI/CLI.hpp>
#include <clocale>
#include <csignal>
#include <functional>
#include <string>

#include "client/Commands.h"
#include "client/Words.h"

namespace keepsakes {
namespace {

/// The command line: what was typed, and what is to be done about it.
class CommandLine {
  public:
    int run(int argc, char** argv) {
        addQueries();
        addWork();
        addTransfer();
        addDefaults();
        app_.set_version_flag("--version", KEEPSAKES_VERSION);
        app_.require_subcommand(1);
        // The parser itself would only say that a command is missing.
        const std::string first = argc > 1 ? argv[1] : "-";
        const auto isFirst = [&first](CLI::App* command) { return command->get_name() == first; };
        if (!first.starts_with('-') && app_.get_subcommands(isFirst).empty()) {
            return Console(false).usage("no command \"" + first + "\"; see --help");
        }
        try {
            app_.parse(argc, argv);
        } catch (const CLI::ParseError& error) {
            return app_.exit(error) == 0 ? kDone : kUsage;
        }
        return chosen_(Console(json_));
    }

  private:
    using Act = std::function<int(const Console&)>;

    CLI::App* add(CLI::App& parent, const std::string& name, const std::string& help, Act act) {
        auto* command = parent.add_subcommand(name, help);
        command->add_flag("--json", json_, "Print JSON in place of a table");
        command->callback([this, act = std::move(act)] { chosen_ = act; });
        return command;
    }

    void addWindow(CLI::App* command) {
        command
            ->add_option("--since", words_.since,
                         "From TIME on: ISO 8601, now, today, yesterday, or ago: 90m, 12h, "
                         "3d, 2w")
            ->type_name("TIME");
        command->add_option("--until", words_.until, "Up to TIME; a day counts as a whole")
            ->type_name("TIME");
        command->add_option("--limit", words_.limit, "At most N")->check(CLI::PositiveNumber);
        command->add_flag("--descending", words_.descending, "Newest first");
    }

    void addQueries() {
        add(app_, "status", "What the daemon tells of itself", showStatus);
        auto* events = add(app_, "events", "Stored events",
                           [this](const Console& console) { return showEvents(console, words_); });
        addWindow(events);
        events->add_option("--category", words_.category, "Only of this kind: " + categoryNames())
            ->type_name("NAME");
        auto* bundles =
            add(app_, "bundles", "Stored bundles with their events",
                [this](const Console& console) { return showBundles(console, words_); });
        addWindow(bundles);
        bundles->add_flag("--brief", words_.brief, "A line for each, without its events");
        bundles->add_flag("--filtered", words_.filtered, "Only bundles that a rule made");
        auto* trends =
            add(app_, "trends", "Yesterday beside four weeks of stored events, or of a file's",
                [this](const Console& console) { return showTrends(console, file_, now_); });
        trends->add_option("FILE", file_, "JSON as \"events --json\" prints it; - for input");
        trends->add_option("--now", now_, "What time it is for a daemon whose clock was set")
            ->type_name("TIME");
    }

    void addWork() {
        const auto work = [](Work operation) {
            return [operation](const Console& console) { return doWork(console, operation); };
        };
        add(app_, "collect", "Collect new events now", work(&ConduitClient::collectEvents));
        add(app_, "bundle", "Bundle the events now", work(&ConduitClient::bundleEvents));
        add(app_, "analytics", "Run the analytics now", work(&ConduitClient::runAnalytics));
        add(app_, "purge", "Delete what has expired", work(&ConduitClient::purgeEvents));
        add(app_, "clear", "Delete every event and bundle", [this](const Console& console) {
            return clearEvents(console, yes_);
        })->add_flag("--yes", yes_, "Do not ask");
    }

    void addTransfer() {
        add(app_, "store", "Store events",
            [this](const Console& console) { return storeFile(console, file_); })
            ->add_option("FILE", file_, "JSON as \"events --json\" prints it; - for input")
            ->required();
        add(app_, "export", "Write every event and bundle as JSON Lines",
            [this](const Console& console) { return exportRecords(console, file_); })
            ->add_option("FILE", file_, "Where to; standard output when not given");
        add(app_, "import", "Store the events of an export",
            [this](const Console& console) { return importRecords(console, file_); })
            ->add_option("FILE", file_, "What export wrote; - for input")
            ->required();
    }

    void addDefaults() {
        auto* defaults = app_.add_subcommand("defaults", "Read and change user defaults");
        defaults->require_subcommand(1);
        const auto addOne = [&](const std::string& name, const std::string& help, Act act) {
            auto* command = add(*defaults, name, help, std::move(act));
            command->add_option("DOMAIN", domain_, "Such as com.brindle.keepsakesd")->required();
            return command;
        };
        addOne("read", "Print a value, or all of a domain", [this](const Console& console) {
            return readDefault(console, domain_, key_);
        })->add_option("KEY", key_, "All when not given");
        auto* write = addOne("write", "Set a value", [this](const Console& console) {
            return writeDefault(console, domain_, key_, value_);
        });
        write->add_option("KEY", key_, "The value's name")->required();
        write
            ->add_option("VALUE", value_,
                         "true, false, an integer, a number, an ISO 8601 date, else text")
            ->required();
        addOne("delete", "Remove a value",
               [this](const Console& console) { return deleteDefault(console, domain_, key_); })
            ->add_option("KEY", key_, "The value's name")
            ->required();
    }

    CLI::App app_{
        "The client of keepsakesd, which keeps what happened in your life.\n"
        "Exit status: 0 done, 1 the daemon answered an error, 2 usage, 3 no daemon.",
        "keepsakesctl"};
    Act chosen_;
    FetchWords words_;
    std::string file_;
    std::string now_;
    std::string domain_;
    std::string key_;
    std::string value_;
    bool json_ = false;
    bool yes_ = false;
};

}  // namespace
}  // namespace keepsakes

int main(int argc, char** argv) {
    std::setlocale(LC_ALL, "");  // NOLINT(concurrency-mt-unsafe): no other thread runs yet
    std::signal(SIGPIPE, SIG_IGN);
    return keepsakes::CommandLine().run(argc, argv);
}
