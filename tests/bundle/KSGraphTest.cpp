// SPDX-License-Identifier: Apache-2.0
#include "bundle/KSGraph.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <random>

#include "support/RecordedAssertions.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using Edges = std::vector<KSGraph::Edge>;

std::vector<int> labels(unsigned vertices, Edges edges, int mode) {
    return KSGraph::initWithNumVertices(vertices, std::move(edges))
        ->calculateConnectedComponentWithGraphTraversal(mode);
}

TEST(KSGraph, LabelsComponentsInTheOrderOfTheirLowestVertex) {
    for (const int mode : {KSGraph::kBreadthFirst, KSGraph::kDepthFirst}) {
        EXPECT_THAT(labels(3, {}, mode), ElementsAre(1, 2, 3));
        EXPECT_THAT(labels(4, {{0, 2}, {3, 2}}, mode), ElementsAre(1, 2, 1, 1));
        EXPECT_THAT(labels(2, {{1, 1}, {0, 1}, {0, 1}}, mode), ElementsAre(1, 1));
    }
}

TEST(KSGraph, BothTraversalsAgreeOnRandomGraphsAndLongChains) {
    std::mt19937 random(1);
    for (int round = 0; round < 50; ++round) {
        std::uniform_int_distribution vertex(0, 59);
        Edges edges;
        for (int edge = 0; edge < round; ++edge) edges.emplace_back(vertex(random), vertex(random));
        EXPECT_EQ(labels(60, edges, KSGraph::kBreadthFirst),
                  labels(60, edges, KSGraph::kDepthFirst));
    }
    Edges chain;
    for (int link = 1; link < 300000; ++link) chain.emplace_back(link - 1, link);
    EXPECT_EQ(labels(300000, chain, KSGraph::kDepthFirst), std::vector<int>(300000, 1));
}

TEST(KSGraph, RefusesWhatIsNoGraph) {
    struct Row {
        unsigned vertices;
        std::optional<Edges> edges;
        const char* condition;
    };
    const Row rows[] = {
        {0, Edges{}, "numVertices > 0"},
        {5, std::nullopt, "edges"},
        {5, Edges{{0, 1}, {-1, 0}}, "edges[i][0].intValue >= 0"},
        {5, Edges{{5, 0}}, "edges[i][0].intValue < numVertices"},
        {5, Edges{{0, -1}}, "edges[i][1].intValue >= 0"},
        {5, Edges{{0, 5}}, "edges[i][1].intValue < numVertices"},
    };
    for (const auto& row : rows) {
        RecordedAssertions assertions;
        EXPECT_FALSE(KSGraph::initWithNumVertices(row.vertices, row.edges));
        EXPECT_THAT(assertions.takeDescriptions(),
                    ElementsAre(std::string("Invalid parameter not satisfying: ") + row.condition));
    }
}

}  // namespace
}  // namespace keepsakes
