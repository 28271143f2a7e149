// SPDX-License-Identifier: Apache-2.0
#include "readers/CalendarReader.h"
#include "readers/ContactReader.h"
#include "readers/MailReader.h"
#include "readers/MessageBackupReader.h"

namespace keepsakes {

namespace {

/// The file's bytes, and word of how far they were read.
ReadBlock readTelling(int fd, const ReaderContext& context) {
    auto read = readDescriptor(fd);
    if (!context.progress) return read;
    return [read = std::move(read), progress = context.progress, bytes = std::uint64_t{0}](
               std::span<char> into) mutable -> std::expected<std::size_t, std::string> {
        auto count = read(into);
        if (count) progress(bytes += *count);
        return count;
    };
}

}  // namespace

std::expected<void, std::string> readMailFile(int fd, const ReaderContext& context,
                                              PeopleSink& sink) {
    return readMail(readDescriptor(fd), context, sink);
}

std::expected<void, std::string> readMailboxFile(int fd, const ReaderContext& context,
                                                 PeopleSink& sink) {
    return readMailbox(readTelling(fd, context), context, sink);
}

std::expected<void, std::string> readMessageBackupFile(int fd, const ReaderContext& context,
                                                       PeopleSink& sink) {
    return readMessageBackup(readTelling(fd, context), context, sink);
}

std::expected<void, std::string> readContactFile(int fd, const ReaderContext& context,
                                                 PeopleSink& sink) {
    return readContacts(readTelling(fd, context), sink);
}

std::expected<FileRecords, std::string> readCalendarFile(int fd, const ReaderContext& context) {
    return readCalendar(readTelling(fd, context), context);
}

}  // namespace keepsakes
