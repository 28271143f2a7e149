// SPDX-License-Identifier: Apache-2.0
#include "readers/MessageBackupReader.h"

#include <fmt/format.h>
#include <fmt/ranges.h>

#include <algorithm>
#include <charconv>
#include <set>
#include <utility>

#include "core/MurmurHash3.h"
#include "readers/Handles.h"
#include "readers/ReaderLimits.h"
#include "readers/TextFolding.h"
#include "readers/XmlFilter.h"

namespace keepsakes {

namespace {

using Mechanism = InteractionMechanism;
using Direction = InteractionDirection;

constexpr std::uint32_t kMessageIdentitySeed = 0x736d7321;

// Values of Android's telephony provider, which the format writes as they are.
constexpr int kBoxReceived = 1;
constexpr int kBoxSent = 2;
constexpr int kAddressFrom = 137;

struct CallKind {
    int type;
    Direction direction;
    Mechanism mechanism;
};
constexpr auto kCallKinds = std::to_array<CallKind>({
    {1, Direction::incoming, Mechanism::phoneCall},
    {2, Direction::outgoing, Mechanism::phoneCall},
    {3, Direction::incoming, Mechanism::unansweredCall},
    {4, Direction::incoming, Mechanism::voicemail},
    {5, Direction::incoming, Mechanism::rejectedCall},
    {6, Direction::incoming, Mechanism::rejectedCall},  // by the list of blocked numbers
    {7, Direction::incoming, Mechanism::phoneCall},     // answered on another device
});

template <class Number>
std::optional<Number> numberOf(XmlAttributes attributes, std::string_view name) {
    const auto text = attributes.find(name);
    if (!text) return std::nullopt;
    Number number = 0;
    const auto [end, error] = std::from_chars(text->data(), text->data() + text->size(), number);
    if (error != std::errc() || end != text->data() + text->size()) return std::nullopt;
    return number;
}

/// The handles of an address attribute: one, or several of a group, which stand joined by "~".
std::vector<std::string> handlesOf(std::string_view addresses) {
    std::vector<std::string> handles;
    while (!addresses.empty() && handles.size() < limits::kMostRecipients) {
        const auto end = std::min(addresses.find('~'), addresses.size());
        auto handle = handleOf(addresses.substr(0, end));
        addresses.remove_prefix(std::min(end + 1, addresses.size()));
        if (handle.empty() || std::ranges::find(handles, handle) != handles.end()) continue;
        handles.push_back(std::move(handle));
    }
    return handles;
}

class Backup final : public XmlHandler {
  public:
    Backup(const ReaderContext& context, PeopleSink& sink) : context_(context), sink_(sink) {}

    void startElement(std::string_view name, XmlAttributes attributes) override {
        if (depth_++ == 0) {
            isBackup_ = name == "smses" || name == "calls";
            root_ = name.substr(0, limits::kLongestValue);
            return;
        }
        if (!isBackup_) return;
        if (depth_ == 2 && name == "sms") sms(attributes);
        if (depth_ == 2 && name == "mms") startMms(attributes);
        if (depth_ == 2 && name == "call") call(attributes);
        if (name == "addr" && mms_) addAddress(attributes);
        if (name == "part" && mms_) addLinks(attributes, "text", mms_->links);
    }

    void endElement() override {
        if (--depth_ == 1 && mms_) endMms();
    }

    void text(std::string_view) override {}

    std::expected<void, std::string> finish() const {
        if (!isBackup_) {
            return std::unexpected(fmt::format(
                "the root element <{}> is neither a backup of messages nor of calls", root_));
        }
        if (taken_ == 0 && undated_ > 0) return std::unexpected("no date in it is believed");
        return {};
    }

  private:
    /// A multimedia message while its parts are read.
    struct Mms {
        KSDate date;
        int box = 0;
        bool isRich = false;
        std::string identity;
        std::string address;
        std::string contact;
        std::vector<std::string> participants;
        std::string from;
        bool isStarred = false;
        LinkList links;
    };

    std::optional<KSDate> dateOf(XmlAttributes attributes) {
        const auto milliseconds = numberOf<std::int64_t>(attributes, "date");
        if (milliseconds) {
            const auto date = KSDate::fromUnix(static_cast<double>(*milliseconds) / 1000);
            if (limits::isSane(date, context_.now)) return date;
        }
        ++undated_;
        return std::nullopt;
    }

    static std::string textOf(XmlAttributes attributes, std::string_view name) {
        const auto text = attributes.find(name).value_or("");
        return text == "null" ? std::string() : std::string(text);
    }

    void sms(XmlAttributes attributes) {
        const auto date = dateOf(attributes);
        if (!date) return;
        const auto address = textOf(attributes, "address");
        const auto box = numberOf<int>(attributes, "type").value_or(0);
        InteractionRecord record{.start = *date, .end = *date, .mechanism = Mechanism::textMessage};
        const auto people = handlesOf(address);
        // A name in place of a number is that of a service.
        if (std::ranges::any_of(people, isServiceCode) || (people.empty() && !address.empty())) {
            record.mechanism = Mechanism::serviceMessage;
        } else if (people.size() > 1) {
            record.mechanism = Mechanism::groupTextMessage;
        }
        learn(people, textOf(attributes, "contact_name"));
        direct(record, box, people, people.empty() ? "" : people.front());
        LinkList links;
        addLinks(attributes, "body", links);
        finish(record, fmt::format("sms {} {} {}", date->seconds, address, box));
        tell(links, isLocked(attributes));
    }

    void startMms(XmlAttributes attributes) {
        const auto date = dateOf(attributes);
        if (!date) return;
        const auto transaction = textOf(attributes, "tr_id");
        mms_ = Mms{.date = *date,
                   .box = numberOf<int>(attributes, "msg_box").value_or(0),
                   .isRich = transaction.starts_with("proto:"),
                   .identity = textOf(attributes, "m_id") + transaction,
                   .address = textOf(attributes, "address"),
                   .contact = textOf(attributes, "contact_name"),
                   .participants = {},
                   .from = {},
                   .isStarred = isLocked(attributes),
                   .links = {}};
    }

    void addAddress(XmlAttributes attributes) {
        auto handle = handleOf(textOf(attributes, "address"));
        if (handle.empty()) return;
        if (numberOf<int>(attributes, "type") == kAddressFrom) mms_->from = handle;
        auto& all = mms_->participants;
        if (all.size() < limits::kMostRecipients && std::ranges::find(all, handle) == all.end()) {
            all.push_back(std::move(handle));
        }
    }

    void endMms() {
        const auto mms = *std::exchange(mms_, std::nullopt);
        const auto addressed = handlesOf(mms.address);
        if (addressed.size() == 1) learn(addressed, mms.contact);
        if (mms.box == kBoxSent && mms.from.starts_with("tel:")) sink_.ownerHandle(mms.from);
        // The addresses name the owner too; where they are missing the attribute has the others.
        auto people = mms.participants;
        if (mms.box != kBoxReceived) std::erase(people, mms.from);
        if (people.empty()) people = addressed;
        auto sender = mms.from;
        if (sender.empty() && !addressed.empty()) sender = addressed.front();
        InteractionRecord record{.start = mms.date, .end = mms.date};
        record.mechanism = mms.isRich             ? Mechanism::richMessage
                           : addressed.size() > 1 ? Mechanism::groupTextMessage
                                                  : Mechanism::multimediaMessage;
        direct(record, mms.box, people, sender);
        finish(record, fmt::format("mms {} {} {} {}", mms.date.seconds, mms.address, mms.box,
                                   mms.identity));
        tell(mms.links, mms.isStarred);
    }

    /// "Locked" keeps a message from being deleted: the one mark that the format has.
    static bool isLocked(XmlAttributes attributes) {
        return numberOf<int>(attributes, "locked").value_or(0) != 0;
    }

    /// Of the text, the filter leaves the links.
    static void addLinks(XmlAttributes attributes, std::string_view name, LinkList& links) {
        findLinks(attributes.find(name).value_or(""), links);
    }

    void tell(const LinkList& links, bool isStarred) {
        for (const auto& link : links.links()) {
            sink_.link(
                {.link = link, .room = {}, .roomName = {}, .account = {}, .isStarred = isStarred});
        }
    }

    void call(XmlAttributes attributes) {
        const auto date = dateOf(attributes);
        const auto type = numberOf<int>(attributes, "type");
        const auto* const kind = std::ranges::find(kCallKinds, type.value_or(0), &CallKind::type);
        if (!date || kind == kCallKinds.end()) return;
        const auto number = textOf(attributes, "number");
        const auto seconds = numberOf<double>(attributes, "duration").value_or(0);
        InteractionRecord record{.start = *date, .end = *date, .mechanism = kind->mechanism};
        if (seconds > 0) record.end = *date + std::min(seconds, limits::kLongestCall);
        if (kind->mechanism == Mechanism::phoneCall && !(seconds > 0)) {
            record.mechanism = Mechanism::unansweredCall;
        }
        const auto people = handlesOf(number);
        learn(people, textOf(attributes, "contact_name"));
        direct(record, kind->direction == Direction::outgoing ? kBoxSent : kBoxReceived, people,
               people.empty() ? "" : people.front());
        finish(record, fmt::format("call {} {} {}", date->seconds, number, *type));
    }

    /// Who of the people sent it and who got it.
    static void direct(InteractionRecord& record, int box, const std::vector<std::string>& people,
                       const std::string& sender) {
        record.recipients = people;
        if (box == kBoxReceived) {
            record.direction = Direction::incoming;
            record.sender = sender;
            std::erase(record.recipients, sender);
            return;
        }
        record.direction = Direction::outgoing;
        if (box != kBoxSent) record.mechanism = Mechanism::unsentMessage;
    }

    void finish(InteractionRecord& record, const std::string& identity) {
        record.identity = murmurHash3(identity, kMessageIdentitySeed);
        sink_.interaction(record);
        ++taken_;
    }

    /// A name that the phone's own address book gave.
    void learn(const std::vector<std::string>& people, const std::string& name) {
        if (people.size() != 1 || isServiceCode(people.front())) return;
        if (name.empty() || name == "(Unknown)" || name.size() > limits::kLongestName) return;
        if (known_.size() >= limits::kMostCards || !known_.emplace(people.front(), name).second) {
            return;
        }
        sink_.card({.uid = {},
                    .name = cleanText(name),
                    .handles = people,
                    .position = {},
                    .fromPhone = true});
    }

    const ReaderContext& context_;
    PeopleSink& sink_;
    std::size_t depth_ = 0;
    bool isBackup_ = false;
    std::string root_;
    std::optional<Mms> mms_;
    std::set<std::pair<std::string, std::string>> known_;
    std::uint64_t taken_ = 0;
    std::uint64_t undated_ = 0;
};

}  // namespace

std::expected<void, std::string> readMessageBackup(const ReadBlock& read,
                                                   const ReaderContext& context, PeopleSink& sink) {
    Backup backup(context, sink);
    const auto filtered = withoutAttributes(read, {"data", "subject", "sub"}, {"body", "text"});
    if (auto done = readXml(filtered, backup); !done) return done;
    return backup.finish();
}

}  // namespace keepsakes
