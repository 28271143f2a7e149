// SPDX-License-Identifier: Apache-2.0
// The indexer with a reader whose files do what their first word says: crash, hang, eat memory, or
// try to leave the sandbox. Its files get a second each.
#include <sys/socket.h>
#include <unistd.h>

#include <csignal>
#include <cstdlib>
#include <fstream>
#include <memory>

#include "TextReader.h"
#include "indexer/IndexerMain.h"

namespace keepsakes {
namespace {

/// What a reader that was taken over could still do.
std::string escapes(const std::string& outside) {
    std::string done;
    if (std::ifstream(outside)) done += " read-outside";
    if (std::ofstream(outside + ".new")) done += " write-outside";
    if (::socket(AF_INET, SOCK_STREAM, 0) >= 0) done += " socket";
    const pid_t child = ::fork();
    if (child == 0) ::_exit(0);
    if (child > 0) done += " fork";
    ::execl("/bin/true", "true", nullptr);
    if (::kill(::getppid(), 0) == 0) done += " signal";
    return done.empty() ? "confined" : "escaped:" + done;
}

class PlantedReader final : public TextReader {
  public:
    std::expected<std::optional<FileRecords>, std::string> read(int fd, int wanted,
                                                                const ReaderContext& context,
                                                                LocationSink& places,
                                                                PeopleSink& people) override {
        auto records = TextReader::read(fd, wanted, context, places, people);
        const auto content = reads.back();
        if (content.starts_with("crash")) {
            std::signal(SIGSEGV, SIG_DFL);  // a sanitizer would make an exit status of it
            std::raise(SIGSEGV);
        }
        if (content.starts_with("abort")) std::abort();
        while (content.starts_with("hang")) ::pause();
        if (content.starts_with("eat")) {
            for (std::size_t size = 1 << 20; content.size() > 1; size *= 2) {
                const auto block = std::make_unique_for_overwrite<char[]>(size);
                *static_cast<volatile char*>(block.get()) = 'x';  // so that it is really asked for
                if (size > (std::size_t{1} << 36)) return std::unexpected("was given 64 GiB");
            }
        }
        if (content.starts_with("escape ")) return std::unexpected(escapes(content.substr(7)));
        return records;
    }
};

}  // namespace
}  // namespace keepsakes

int main(int argc, char** argv) {
    std::vector<char*> words(argv, argv + argc);
    std::string option = "--seconds-per-file";
    std::string seconds = "3";
    words.push_back(option.data());
    words.push_back(seconds.data());
    keepsakes::PlantedReader reader;
    return keepsakes::runIndexer(static_cast<int>(words.size()), words.data(), reader);
}
