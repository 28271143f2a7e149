// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "indexer/FileReader.h"

namespace keepsakes {

/// The program `keepsakes-indexer` around a reader: takes its arguments, confines the process,
/// scans once, answers the exit status. 0: the scan came to its end; 1: it could not run, which
/// standard error says; 2: wrong usage; 3: another scan works on this index; 4: told to stop.
int runIndexer(int argc, char** argv, FileReader& reader);

}  // namespace keepsakes
