// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <string_view>

namespace keepsakes {

// A handle is how somebody is reached, in the one form in which two spellings of it are equal:
// "tel:512345678", "mailto:anna@example.org", "im:@anna:example.org". Empty when the text is none.

/// A telephone number: its last nine digits, so that country and trunk prefixes make no difference;
/// of seven or eight digits, all. Three to six digits are the short codes of services: "code:…".
/// Text that holds letters is no number.
std::string phoneHandle(std::string_view number);

/// A mail address, in lower case. Takes "mailto:".
std::string mailHandle(std::string_view address);

/// An instant-messaging address (Matrix, XMPP), in lower case, without its scheme and resource.
std::string chatHandle(std::string_view address);

/// Of any kind, told by its form: what a configuration or a messenger writes.
std::string handleOf(std::string_view text);

/// Whether the handle is a short code.
bool isServiceCode(std::string_view handle);

/// Whether nobody reads what is sent to the address: "noreply", "mailer-daemon" and the like.
bool isMachineAddress(std::string_view mailHandle);

/// The handle as people read it: without what tells its kind.
std::string_view shownHandle(std::string_view handle);

}  // namespace keepsakes
