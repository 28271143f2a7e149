// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>

namespace keepsakes {

class KSEventBundle;

/// The plain sentence that a client shows with a bundle: what its rule stands for, or what a
/// cluster holds, then the activities, the time and the photos. "A hike with photos: Hiking,
/// Saturday 10:02 to 12:31, 14 photos of mountains". All its words stand in PromptLanguage.cpp.
std::string promptLanguageOf(const KSEventBundle& bundle);

}  // namespace keepsakes
