// SPDX-License-Identifier: Apache-2.0
#include <gtest/gtest.h>

#include <cstdlib>

#include "support/FakeConduit.h"
#include "wire/BusListener.h"

namespace keepsakes {
namespace {

TEST(OtherLanguageTest, APythonClientStoresAndFetches) {
    FakeConduit conduit;
    const auto listener = BusListener::claim().value();
    listener->resume(conduit, conduit);
    EXPECT_EQ(std::system("/usr/bin/python3 " OTHER_CLIENT), 0);
    EXPECT_EQ(conduit.events().size(), 1u);
}

}  // namespace
}  // namespace keepsakes
