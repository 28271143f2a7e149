// SPDX-License-Identifier: Apache-2.0
#include "indexer/ContentReader.h"
#include "indexer/IndexerMain.h"

int main(int argc, char** argv) {
    keepsakes::ContentReader reader;
    return keepsakes::runIndexer(argc, argv, reader);
}
