// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string_view>
#include <vector>

#include "readers/XmlStream.h"

namespace keepsakes {

/// Passes a document (in an encoding that holds ASCII) on without the values of the attributes
/// named, so that neither a message's text nor its pictures, which stand there as one token of many
/// megabytes, ever reach the parser. Also takes away references to surrogates (&#55357;&#56832;),
/// which some programs write for emoji and no parser accepts. Of the attributes `searched` the
/// values are passed on as the links in them (see LinkFinder.h) with blanks between.
ReadBlock withoutAttributes(ReadBlock read, std::vector<std::string_view> names,
                            std::vector<std::string_view> searched = {});

}  // namespace keepsakes
