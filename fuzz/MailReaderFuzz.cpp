// SPDX-License-Identifier: Apache-2.0
// Property: what a mailbox, a mail or a backup of messages tells does not depend on how the bytes
// come in, every time is a sane one, every handle is in its own form, and nobody is told twice. The
// first byte chooses the reader, the second the sizes of the blocks.
#include <algorithm>
#include <cstdint>
#include <set>
#include <string>
#include <vector>

#include "PeopleCheck.h"
#include "ReaderCheck.h"
#include "readers/MailReader.h"
#include "readers/MessageBackupReader.h"

namespace {

using namespace keepsakes;

constexpr std::string_view kSeeds[] = {
    "From a Fri Jun 14 08:00:00 2024\nFrom: \"A, B\" <a@x.org> (c)\nTo: g: b@x.org, <@r:c@x.org>;\n"
    "Date: Fri, 14 Jun 2024 08:00:00 +0200\nMessage-ID: <1@x>\n\ntext\n\nFrom b 14 Jun 08:00 2024\n"
    "From: b@x.org\nDate: 14 Jun 24 08:00 EST\nList-Id: x\n\n",
    "Received: x\n y\nFrom: a@x.org\nDate: 14 Jun 2024 08:00:00 Z\nCc: b@x.org, c@x.org\n\n",
    "<smses><sms address='+436605551234' date='1718344800000' type='1' "
    "body='&#55357;http://x.org/&amp;&#39;'"
    " contact_name='A'/><mms msg_box='2' date='1718344800000' address='111111111~222222222'><addrs>"
    "<addr address='333333333' type='137'/></addrs></mms><call number='111111111' type='1'"
    " duration='5' date='1718344800000'/></smses>",
    "From b 14 Jun 08:00 2024\nFrom: a@x.org\nDate: 14 Jun 2024 08:00:00 Z\nContent-Type: "
    "multipart/mixed; "
    "boundary=b\n\n--b\n"
    "\nhttp://x.org/a).\n--b\nContent-Type: text/html; charset=utf-8\n"
    "Content-Transfer-Encoding: quoted-printable\n\n<blockquote></blockquote><a "
    "href=3D\"http://x.or=\n"
    "g\">T&auml;g<img alt=3D'x'></a>\n--b\nContent-Transfer-Encoding: "
    "base64\n\naHR0cDovL3gu\n--b--\n",
};

std::expected<void, std::string> read(int kind, const ReadBlock& bytes, PeopleSink& sink) {
    switch (kind % 3) {
        case 0:
            return readMailbox(bytes, kFuzzNow, sink);
        case 1:
            return readMail(bytes, kFuzzNow, sink);
        default:
            return readMessageBackup(bytes, kFuzzNow, sink);
    }
}

}  // namespace

extern "C" std::size_t LLVMFuzzerCustomMutator(std::uint8_t* data, std::size_t size,
                                               std::size_t most, unsigned seed) {
    const auto kind = static_cast<unsigned>(seed % std::size(kSeeds));
    return beginOrMutate(chosen(kind, seed >> 8U, kSeeds[kind]), data, size, most);
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size < 2) return 0;
    const std::string bytes(data + 2, data + size);
    PeopleCheck whole;
    PeopleCheck pieces;
    const auto done = read(data[0], inBlocks(bytes, 0), whole);
    const auto again = read(data[0], inBlocks(bytes, 1U + data[1]), pieces);
    check(done.has_value() == again.has_value(), "blocks do not decide whether a file is read");
    check(done || !done.error().empty(), "a refusal has a reason");
    // Of a refused file the blocks may decide how much came before.
    if (done) check(whole == pieces, "blocks do not change the records");
    return 0;
}
