// SPDX-License-Identifier: Apache-2.0
// Property: the cards do not depend on how the bytes come in; folding every line anew, one byte
// behind its start, changes none of them; names and handles are bounded and in their own form. The
// first byte chooses the sizes of the blocks.
#include <cstdint>
#include <string>

#include "FoldedLines.h"
#include "PeopleCheck.h"
#include "readers/ContactReader.h"

namespace {

using namespace keepsakes;

constexpr std::string_view kSeeds[] = {
    "BEGIN:VCARD\r\nVERSION:3.0\r\nitem1.TEL;TYPE=\"a:b\":+43 660\r\n 5551234\r\nFN:A\\, B\r\n"
    "EMAIL:a@x.org\r\nGEO:47;15\r\nUID:u\r\nEND:VCARD\r\n",
    "BEGIN:VCARD\nVERSION:2.1\nN;CHARSET=ISO-8859-1;ENCODING=QUOTED-PRINTABLE:Gr=FCn;=\nA=20\n"
    "AGENT:\nBEGIN:VCARD\nFN:B\nEND:VCARD\nTEL;HOME:0316/55512\nEND:VCARD\n",
    "BEGIN:VCARD\nVERSION:4.0\nFN;ALTID=1:\xE5\xB1\xB1\nIMPP:matrix:u/"
    "t:x.org\nTEL;VALUE=uri:tel:+1-"
    "555-5551234\nGEO:geo:1,2;u=3\nKIND:individual\nEND:VCARD\n",
};

}  // namespace

extern "C" std::size_t LLVMFuzzerCustomMutator(std::uint8_t* data, std::size_t size,
                                               std::size_t most, unsigned seed) {
    const auto text = kSeeds[seed % std::size(kSeeds)];
    return beginOrMutate(static_cast<char>(seed >> 8U) + std::string(text), data, size, most);
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size < 1) return 0;
    const std::string bytes(data + 1, data + size);
    PeopleCheck whole;
    PeopleCheck pieces;
    const auto done = readContacts(inBlocks(bytes, 0), whole);
    const auto again = readContacts(inBlocks(bytes, 1U + data[0]), pieces);
    check(done == again, "blocks do not decide whether a file is read");
    check(whole == pieces, "blocks do not change the cards");
    check(done || !done.error().empty(), "a refusal has a reason");
    // A line that goes on as quoted-printable, or is cut for its length, is folded otherwise.
    if (bytes.find('=') != std::string::npos || bytes.size() > limits::kLongestField) return 0;
    if (bytes.starts_with("\xEF\xBB\xBF")) return 0;
    PeopleCheck refolded;
    const auto other = folded(bytes);
    (void)!readContacts(inBlocks(other, 0), refolded).has_value();
    check(whole == refolded, "folding does not change the cards");
    return 0;
}
