// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <algorithm>
#include <cstdint>
#include <expected>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "readers/XmlStream.h"

namespace keepsakes {

/// A value that holds no others: a string, a number, or (with neither) true, false or null.
struct JsonScalar {
    std::optional<std::string_view> text;  ///< Valid during the call that passes it.
    std::optional<double> number;

    /// The number, also one that is written as a string, as formats do whose numbers are long.
    std::optional<double> asNumber() const;
};

/// Is told what the document holds, in its order.
class JsonHandler {
  public:
    virtual ~JsonHandler() = default;
    virtual void startObject() = 0;
    virtual void endObject() = 0;
    virtual void startArray() = 0;
    virtual void endArray() = 0;
    /// The name of the member whose value comes next; valid during the call.
    virtual void key(std::string_view name) = 0;
    virtual void scalar(const JsonScalar& value) = 0;
};

/// Reads a document (RFC 8259) of any size in flat memory: no more than one string is held.
/// Answers an error (with the byte) for what is not well-formed, cut or too deep, and for text
/// that goes on too long without a string or number; the handler has then seen a part of it.
std::expected<void, std::string> readJson(const ReadBlock& read, JsonHandler& handler);

/// The same for a document in memory.
std::expected<void, std::string> readJson(std::string_view document, JsonHandler& handler);

/// Where a member of the object at `parent` stands.
template <class Place>
struct JsonStep {
    Place parent;
    std::string_view name;
    Place child;
};

/// `Place::ignored` for what the table does not hold.
template <class Place>
Place stepFrom(Place parent, std::string_view name, std::span<const JsonStep<Place>> steps) {
    const auto found = std::ranges::find_if(steps, [&](const JsonStep<Place>& step) {
        return step.parent == parent && step.name == name;
    });
    return found == steps.end() ? Place::ignored : found->child;
}

/// A handler that knows where in the document it is. `Place` is an enumeration of the places that
/// matter, among them `document` (the top) and `ignored` (all others, with everything in them). The
/// elements of an array stand at the place of the array.
template <class Place>
class JsonPlaces : public JsonHandler {
  public:
    void startObject() final {
        places_.push_back(next_);
        if (next_ != Place::ignored) enter(next_);
    }
    void endObject() final { close(); }
    void startArray() final {
        if (next_ == Place::document) next_ = elementOfDocument();
        places_.push_back(next_);
        if (next_ != Place::ignored) enterArray(next_);
    }
    void endArray() final { close(/*isArray=*/true); }
    void key(std::string_view name) final {
        const auto parent = places_.back();
        next_ = parent == Place::ignored ? parent : placeOf(parent, name);
    }
    void scalar(const JsonScalar& value) final {
        if (next_ != Place::ignored) take(next_, value);
    }

  protected:
    /// The place of a member of the object at `parent`.
    virtual Place placeOf(Place parent, std::string_view name) const = 0;
    /// The place of the elements when the document is an array.
    virtual Place elementOfDocument() const { return Place::ignored; }
    virtual void enter(Place place) = 0;
    virtual void leave(Place place) = 0;
    virtual void enterArray(Place) {}
    virtual void leaveArray(Place) {}
    virtual void take(Place place, const JsonScalar& value) = 0;

  private:
    void close(bool isArray = false) {
        const auto place = places_.back();
        places_.pop_back();
        next_ = places_.empty() ? Place::document : places_.back();
        if (place == Place::ignored) return;
        isArray ? leaveArray(place) : leave(place);
    }

    std::vector<Place> places_;  // as deep as the parser allows
    Place next_ = Place::document;
};

}  // namespace keepsakes
