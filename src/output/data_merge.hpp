#pragma once
// Merging of the per-process result files of a run on several processes
// into one file under the output's plain name.
//
// The files must agree in start time, time steps, number of steps, number of
// variables (dynamic items) and, for point, line and grid files, the number
// of values of an item; a mismatch is the fatal error "DataMerge: ... mismatch,
// file: " and the file.
//
// How values join:
//   kMergeSum    one value per item that each process holds for its part
//                (mass budgets, discharges): the sum;
//   kMergeFirst  points, lines and grids: at each position the value of the
//                process that holds the point (not the delete value, nor the
//                land value of a grid); the delete value when no process has
//                data there, the land value when all have the land value;
//   kMergeMesh   mesh files: the elements of all processes, joined by their
//                ids (nodes shared by processes written once); ordering 1
//                keeps the process order, 2 sorts the elements by id.
//
// merge_data: 0 keeps the per-process files only; 1 merges and keeps them;
// 2 merges and deletes them.

#include <string>
#include <vector>

#include "core/run.hpp"

namespace vhd {

struct OutputList;

enum class MergeRule { kMergeSum, kMergeFirst, kMergeMesh };

// Merges files into output. land_value is used by kMergeFirst on grids
// (pass the delete value otherwise); ordering by kMergeMesh.
void DataMerge(const std::vector<std::string>& files, const std::string& output, MergeRule rule,
               double land_value, int ordering);

// Process 0 merges every output whose merge_data asks for it, after all
// processes closed their files; every process then logs the "Output
// Statistics" of its outputs. Nothing happens on a single process.
void MergeOutputFiles(OutputList& list, const RunControl& run);

}  // namespace vhd
