// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <utility>
#include <vector>

namespace keepsakes {

/// An undirected graph that labels its connected components. Used by one thread at a time.
class KSGraph final {
  public:
    using Edge = std::pair<int, int>;

    /// Modes of traversal; both give the same labels.
    static constexpr int kBreadthFirst = 1;
    static constexpr int kDepthFirst = 0;

    /// No vertices, no edge array, or an edge that names a vertex outside the graph fails the
    /// assertion that says so and yields nothing. An empty edge array is fine.
    static std::optional<KSGraph> initWithNumVertices(unsigned numVertices,
                                                      std::optional<std::vector<Edge>> edges);

    /// A label for each vertex: 1, 2, 3 … in the order of each component's lowest vertex.
    const std::vector<int>& calculateConnectedComponentWithGraphTraversal(int mode);

    unsigned numVertices() const { return static_cast<unsigned>(membership_.size()); }
    const std::vector<Edge>& edges() const { return edges_; }
    const std::vector<int>& membership() const { return membership_; }
    const std::vector<std::vector<int>>& sparseAdjacencyMatrix() const { return adjacency_; }

  private:
    KSGraph(unsigned numVertices, std::vector<Edge> edges);

    void bfsStartingFrom(int start, int connectedPartIndx);
    void dfsStartingFrom(int start, int connectedPartIndx);

    std::vector<Edge> edges_;
    std::vector<int> membership_;  ///< -1: not visited yet.
    std::vector<std::vector<int>> adjacency_;
};

}  // namespace keepsakes
