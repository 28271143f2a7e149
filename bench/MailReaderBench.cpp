// SPDX-License-Identifier: Apache-2.0
// Reads an mbox file of 100,000 mails beside reading only its bytes, and scans it into an index:
// mails per second, and how the peak of resident memory grows with five times as many.
#include <fcntl.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>

#include "Bench.h"
#include "ScanBench.h"
#include "indexer/ContentReader.h"
#include "support/TemporaryFolder.h"

using namespace keepsakes;
namespace fs = std::filesystem;

namespace {

constexpr int kMails = 100000;
/// What indexing a mail may take, in milliseconds: 500,000 in ten seconds.
constexpr double kMillisecondsPerMail = 0.02;
constexpr long kMostGrowthKiB = 16 * 1024;
const KSDate kNow = parseISO8601("2024-06-16")->date;

class CountingSink final : public PeopleSink {
  public:
    void interaction(const InteractionRecord&) override { ++count; }
    void link(const LinkRecord&) override {}
    void card(const ContactCard&) override {}
    void ownerHandle(const std::string&) override {}
    int count = 0;
};

/// Mails as they come: a dozen lines of what servers add, three kilobytes of text.
void makeMailbox(const fs::path& path, int mails) {
    std::ofstream file(path);
    std::string trace;
    for (int i = 0; i < 8; ++i) {
        trace += fmt::format(
            "Received: from relay{0}.example.org by relay{1}.example.org\n"
            "\twith ESMTPS id {0}abcdef; Fri, 14 Jun 2024 08:00:00 +0000\n",
            i, i + 1);
    }
    std::string text;
    for (int i = 0; i < 45; ++i) {
        text += "Some words of a letter that nobody keeps, up to the usual width of one.\n";
    }
    for (int i = 0; i < mails; ++i) {
        file << fmt::format(
            "From p{0}@example.org Fri Jun 14 08:00:00 2024\n{1}From: \"P{0}\" <p{0}@example.org>\n"
            "To: me@example.org, Q <q{2}@example.org>\nDate: Fri, 14 Jun 2024 {3:02}:{4:02}:{5:02}"
            " +0200\nMessage-ID: <{6}@example.org>\nSubject: No. {6}\n\n{7}\n",
            i % 997, trace, i % 313, i / 3600 % 24, i / 60 % 60, i % 60, i, text);
    }
}

double scanMilliseconds(const fs::path& root, const char* index, std::uint64_t& found) {
    ContentReader reader;
    bench::Scan scan(root);
    const double took = bench::bestMilliseconds(1, [&] {
        scan.run({.index = root / index,
                  .tracks = {},
                  .photos = {},
                  .messages = {root / "Mail"},
                  .contacts = {},
                  .ownerAddresses = {},
                  .now = kNow},
                 reader);
    });
    found = scan.summary().totals.interactions;
    return took;
}

}  // namespace

int main() {
    const TemporaryFolder folder;
    const auto& root = folder.path();
    const auto path = root / "Mail" / "Inbox";
    fs::create_directories(path.parent_path());
    makeMailbox(path, kMails);
    const int fd = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
    const double bytesOnly = bench::readingMilliseconds(3, fd);
    CountingSink sink;
    const double parsed = bench::bestMilliseconds(3, [&] {
        sink.count = 0;
        (void)!readMailboxFile(fd, {.now = kNow}, sink).has_value();
    });
    ::close(fd);
    bench::report(fmt::format("read {} mails ({:.0f} MB) / reading only the bytes", sink.count,
                              static_cast<double>(fs::file_size(path)) / 1e6),
                  parsed, bytesOnly, 10);

    std::uint64_t found = 0;
    const double indexed = scanMilliseconds(root, "small.sqlite", found);
    bench::report(fmt::format("index {} mails ({:.0f} a second)", found,
                              static_cast<double>(found) / indexed * 1000),
                  indexed, kMails * kMillisecondsPerMail, 1);
    const double unchanged = scanMilliseconds(root, "small.sqlite", found);
    bench::note("scan them again, unchanged", unchanged);
    const long before = bench::peakKiB();
    makeMailbox(path, 5 * kMails);
    scanMilliseconds(root, "large.sqlite", found);
    bench::reportGrowth(fmt::format("memory of indexing {} mails more", found - kMails), before,
                        kMostGrowthKiB);
    return found == 5U * kMails ? 0 : 1;
}
