#pragma once

#include <functional>

#include "trl/xml.h"

namespace trl {

class LocalFileIndex;

// Adds every file of a local-files document to `index`, in document order: the `f` children of
// each `d` of each `m` of every `c`, numbered from 1. A missing index or unreadable value is
// reported (as Compare's FillRecordset) and filling goes on.
void FillLocalFileIndex(xml::Document& localFiles, LocalFileIndex* index);
// The same without a report: false, with the index partly filled, at the first failure.
bool TryFillLocalFileIndex(xml::Document& localFiles, LocalFileIndex& index);
// The same for an index that keeps only some names (LocalFileIndex::KeepOnly; TryFillLocalFileIndex
// fills one the plain way): the walk of the files shared out among threads, this one running
// `meanwhile` instead, when given (it must not touch the local files). Nothing may change the
// document meanwhile.
bool TryFillFilteredIndex(xml::Document& localFiles, LocalFileIndex& index,
                          const std::function<void()>& meanwhile = {});
// The same as FillLocalFileIndex without a report: what was reported once is not told again.
void RefillLocalFileIndex(xml::Document& localFiles, LocalFileIndex& index);

}  // namespace trl
