// SPDX-License-Identifier: Apache-2.0
#include "support/TemporaryFolder.h"

#include <cstdlib>
#include <fstream>
#include <stdexcept>
#include <string>

namespace keepsakes {

TemporaryFolder::TemporaryFolder() {
    auto name = (std::filesystem::temp_directory_path() / "keepsakes-test-XXXXXX").string();
    if (!mkdtemp(name.data())) throw std::runtime_error("cannot create " + name);
    path_ = name;
}

TemporaryFolder::~TemporaryFolder() {
    std::error_code ignored;
    std::filesystem::remove_all(path_, ignored);
}

std::filesystem::path TemporaryFolder::write(std::string_view name,
                                             std::string_view content) const {
    const auto path = path_ / name;
    std::filesystem::create_directories(path.parent_path());
    std::ofstream out(path, std::ios::binary);
    out << content;
    if (!out.flush()) throw std::runtime_error("cannot write " + path.string());
    return path;
}

}  // namespace keepsakes
