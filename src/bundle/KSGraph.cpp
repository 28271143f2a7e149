// SPDX-License-Identifier: Apache-2.0
#include "bundle/KSGraph.h"

#include <deque>
#include <ranges>

#include "core/KSAssertion.h"

namespace keepsakes {

namespace {

constexpr int kNotVisited = -1;

bool require(bool satisfied, std::string_view condition) {
    return assertParameter(satisfied, condition, "KSGraph", __LINE__);
}

}  // namespace

KSGraph::KSGraph(unsigned numVertices, std::vector<Edge> edges)
    : edges_(std::move(edges)), membership_(numVertices, kNotVisited), adjacency_(numVertices) {}

std::optional<KSGraph> KSGraph::initWithNumVertices(unsigned numVertices,
                                                    std::optional<std::vector<Edge>> edges) {
    if (!require(numVertices > 0, "numVertices > 0")) return std::nullopt;
    if (!require(edges.has_value(), "edges")) return std::nullopt;
    const int count = static_cast<int>(numVertices);
    for (const auto& [from, to] : *edges) {
        const bool inside = require(from >= 0, "edges[i][0].intValue >= 0") &&
                            require(from < count, "edges[i][0].intValue < numVertices") &&
                            require(to >= 0, "edges[i][1].intValue >= 0") &&
                            require(to < count, "edges[i][1].intValue < numVertices");
        if (!inside) return std::nullopt;
    }
    return KSGraph(numVertices, std::move(*edges));
}

const std::vector<int>& KSGraph::calculateConnectedComponentWithGraphTraversal(int mode) {
    for (const auto& [from, to] : edges_) {
        adjacency_[static_cast<std::size_t>(from)].push_back(to);
        adjacency_[static_cast<std::size_t>(to)].push_back(from);
    }
    int label = 1;
    for (int vertex = 0; vertex < static_cast<int>(membership_.size()); ++vertex) {
        if (membership_[static_cast<std::size_t>(vertex)] != kNotVisited) continue;
        if (mode == kBreadthFirst) {
            bfsStartingFrom(vertex, label);
        } else {
            dfsStartingFrom(vertex, label);
        }
        ++label;
    }
    return membership_;
}

void KSGraph::bfsStartingFrom(int start, int connectedPartIndx) {
    std::deque<int> queue = {start};
    while (!queue.empty()) {
        const auto vertex = static_cast<std::size_t>(queue.front());
        queue.pop_front();
        if (membership_[vertex] != kNotVisited) continue;
        membership_[vertex] = connectedPartIndx;
        queue.insert(queue.end(), adjacency_[vertex].begin(), adjacency_[vertex].end());
    }
}

void KSGraph::dfsStartingFrom(int start, int connectedPartIndx) {
    // A stack of its own: a chain of events as long as the owner's life must not overflow the
    // thread's.
    std::vector<int> stack = {start};
    while (!stack.empty()) {
        const auto vertex = static_cast<std::size_t>(stack.back());
        stack.pop_back();
        if (membership_[vertex] != kNotVisited) continue;
        membership_[vertex] = connectedPartIndx;
        for (const int neighbour : std::views::reverse(adjacency_[vertex])) {
            stack.push_back(neighbour);
        }
    }
}

}  // namespace keepsakes
