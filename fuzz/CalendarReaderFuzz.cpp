// SPDX-License-Identifier: Apache-2.0
// Property: what a calendar tells does not depend on how the bytes come in nor on how its lines are
// folded; occurrences lie in a believed time and are of bounded length and number; a suggestion has
// a category. The first byte chooses the sizes of the blocks.
#include <cstdint>
#include <string>

#include "FoldedLines.h"
#include "PeopleCheck.h"
#include "readers/CalendarReader.h"

namespace {

using namespace keepsakes;

constexpr std::string_view kSeeds[] = {
    "BEGIN:VCALENDAR\r\nBEGIN:VEVENT\r\nUID:a\r\nSUMMARY:Flight AB 8075 from HEL to TXL\r\n"
    "DTSTART;TZID=Europe/Helsinki:20170920T150500\r\nDTEND;TZID=Odd:20170920T160000\r\n"
    "END:VEVENT\r\nBEGIN:VTIMEZONE\r\nTZID:Odd\r\nBEGIN:STANDARD\r\nDTSTART:20001029T030000\r\n"
    "RRULE:FREQ=YEARLY;BYDAY=-1SU;BYMONTH=10\r\nTZOFFSETFROM:+0200\r\nTZOFFSETTO:+0100\r\n"
    "END:STANDARD\r\nEND:VTIMEZONE\r\nEND:VCALENDAR\r\n",
    "BEGIN:VCALENDAR\nBEGIN:VEVENT\nUID:b\nSUMMARY:Dinner\nATTENDEE;CN=A:mailto:a@x\n"
    "ATTENDEE:mailto:b@x\nDTSTART;VALUE=DATE:20240610\nRRULE:FREQ=MONTHLY;BYDAY=2TU;COUNT=9\n"
    "EXDATE;VALUE=DATE:20240710\nRDATE;VALUE=PERIOD:20240611T100000Z/PT2H\nEND:VEVENT\n"
    "BEGIN:VEVENT\nUID:b\nRECURRENCE-ID;RANGE=THISANDFUTURE:20240813\nDTSTART:20240814T100000\n"
    "STATUS:CANCELLED\nEND:VEVENT\nEND:VCALENDAR\n",
    "BEGIN:VCALENDAR\nBEGIN:VEVENT\nSUMMARY:Hotel\nLOCATION:A 1\\, 8010 Graz\\, X\nDURATION:P1D\n"
    "DTSTART;VALUE=DATE:20240610\nX-R:[{\"@context\":\"http://schema.org\"\\,\"@type\":"
    "\"LodgingReservation\"\\,\"checkinTime\":\"2024-06-10T15:00:00+02:00\"}]\nEND:VEVENT\n"
    "END:VCALENDAR\n",
};

void checkRecords(const FileRecords& records) {
    for (const auto& one : records.occurrences) {
        check(one.start >= limits::kEarliestTime &&
                  one.start <= kFuzzNow.now + limits::kFarthestEntry,
              "a believed start");
        check(one.end >= one.start && one.end - one.start <= limits::kLongestEntry,
              "a believed length");
        check(!one.identifier.empty(), "an identifier");
        check(one.title.size() <= limits::kLongestName, "a title of bounded length");
        if (!one.recognition) continue;
        check(one.recognition->category != SuggestionCategory::none, "a category");
        const auto& span = one.recognition->span;
        check(!span || span->start <= span->end, "hours in their order");
    }
}

}  // namespace

extern "C" std::size_t LLVMFuzzerCustomMutator(std::uint8_t* data, std::size_t size,
                                               std::size_t most, unsigned seed) {
    const auto text = kSeeds[seed % std::size(kSeeds)];
    return beginOrMutate(static_cast<char>(seed >> 8U) + std::string(text), data, size, most);
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size < 1) return 0;
    const std::string bytes(data + 1, data + size);
    const auto whole = readCalendar(inBlocks(bytes, bytes.size() + 1), kFuzzNow);
    const auto pieces = readCalendar(inBlocks(bytes, 1U + data[0] % 64U), kFuzzNow);
    check(whole == pieces, "blocks do not change the entries");
    check(whole || !whole.error().empty(), "a refusal has a reason");
    if (whole) checkRecords(*whole);
    // A line that goes on as quoted-printable, or is cut for its length, is folded otherwise.
    if (bytes.find('=') != std::string::npos && bytes.find("RINTABLE") != std::string::npos)
        return 0;
    if (bytes.size() > limits::kLongestField || bytes.starts_with("\xEF\xBB\xBF")) return 0;
    check(whole == readCalendar(inBlocks(folded(bytes), bytes.size() * 4 + 1), kFuzzNow),
          "folding does not change the entries");
    return 0;
}
