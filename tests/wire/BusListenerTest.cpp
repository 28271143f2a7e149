// SPDX-License-Identifier: Apache-2.0
#include "wire/BusListener.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "client/ConduitClient.h"
#include "model/ValueCoding.h"
#include "support/FakeConduit.h"
#include "support/SampleRecords.h"

namespace keepsakes {
namespace {

template <class Record>
KSDictionary archived(const Record& record) {
    ValueEncoder encoder;
    record.encodeWithCoder(encoder);
    return encoder.take();
}

class BusListenerTest : public testing::Test {
  protected:
    BusListenerTest() { listener_->resume(conduit_, conduit_); }

    FakeConduit conduit_;
    std::unique_ptr<BusListener> listener_ = BusListener::claim().value();
    std::unique_ptr<ConduitClient> client_ = ConduitClient::connect().value();
};

TEST_F(BusListenerTest, CarriesEveryFieldOfEventsAndBundles) {
    const auto full = samples::fullEvent(1);
    const auto small = samples::event(2);
    EXPECT_EQ(client_->storeEvents({full, small}), std::nullopt);
    ASSERT_EQ(conduit_.events().size(), 2u);
    EXPECT_EQ(archived(*conduit_.events()[0]), archived(*full));

    const auto fetched = client_->fetchEventsWithOptions({{}, true, {}, {}}).value();
    ASSERT_EQ(fetched.size(), 2u);
    EXPECT_EQ(archived(*fetched[0]), archived(*full));
    EXPECT_EQ(archived(*fetched[1]), archived(*small));

    const auto bundle = samples::bundle({full, small});
    conduit_.setBundles({bundle});
    const auto bundles = client_->fetchEventBundlesWithOptions({}).value();
    ASSERT_EQ(bundles.size(), 1u);
    EXPECT_EQ(archived(*bundles[0]), archived(*bundle));
}

}  // namespace
}  // namespace keepsakes
