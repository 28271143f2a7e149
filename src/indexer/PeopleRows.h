// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <exception>
#include <span>
#include <string>
#include <unordered_map>

#include "indexer/IndexWriter.h"
#include "readers/PeopleRecords.h"

namespace keepsakes {

/// Writes what files tell of people into the index while they are read, file after file. Lives on
/// the scan's thread; the writer outlives it. What fails in the index while a file is read is
/// thrown by `finish`, behind the reader's back: it is not the file's fault.
class PeopleRows final : public PeopleSink {
  public:
    explicit PeopleRows(IndexWriter& index);

    /// The file that what comes next belongs to; what it told before goes.
    void begin(std::int64_t file);
    /// Takes out again what came of the file, when it turns out that it cannot be read.
    void drop();
    void finish();

    void interaction(const InteractionRecord& record) override;
    void link(const LinkRecord& link) override;
    void card(const ContactCard& card) override;
    void ownerHandle(const std::string& handle) override;

  private:
    template <class Work>
    void guarded(const Work& work);
    std::int64_t idOf(const std::string& handle);
    std::string idsOf(std::span<const std::string> handles);
    void changed();

    IndexWriter& index_;
    SQLite::Statement addHandle_;
    SQLite::Statement findHandle_;
    SQLite::Statement addInteraction_;
    SQLite::Statement addLink_;
    SQLite::Statement addCard_;
    SQLite::Statement addRelation_;
    SQLite::Statement addOwner_;
    std::unordered_map<std::string, std::int64_t> known_;
    std::int64_t file_ = 0;
    std::uint64_t count_ = 0;
    std::exception_ptr failure_;
    std::int64_t interaction_ = 0;  ///< That was told last; 0 when it was left out.
    KSDate start_;                  ///< Its start.
};

}  // namespace keepsakes
