#pragma once
// Keys of the partition of a 2D mesh over the processes of a multi-process
// run, read with the domain; the partition itself is parallel/partition.hpp.
//
// Setup keys (section DOMAIN, or its Mesh sub-section, after number_of_domains
// and type_of_reordering):
//   type_of_partitioning      2   1 from a file; 2 METIS 5 graph partition;
//                                 3 without METIS (slices of the Hilbert curve);
//                                 4 METIS 4 (not packaged: runs as type 2, noted
//                                 in the log); 5 multi-layer METIS (on one
//                                 machine it runs as type 2, with the message
//                                 of CalcMultiLayerPartitionMetis)
//   file_name_partitioning    -   type 1: the partition file read; written file
//   item_number_partitioning  1   type 1: item of the file
//   type_of_weighting         0 (2D run), 1 (3D run)   element weights of
//                                 types 2 to 5: 0 none, 1 layers of the 3D
//                                 column, 3 from file_name_weighting /
//                                 item_number_weighting
//   use_METIS5_options        0   > 0: option_1 .. option_11 and option_16 ..
//                                 option_25 override the METIS 5 options
//   small_master_partition    1   m >= 2: sub-domain 1 (process 0, which also
//                                 reads, reports and merges) gets 1/m of the
//                                 load of any other; 0 and 1 give equal loads
//   write_partitioning        0   1: process 0 writes the partition file
//   type_of_halo_layer        2   depth of the halo (used by the sub-domain builder)
// The option keys and their entries are listed in parallel/partition.hpp.

#include <string>
#include <vector>

namespace vhd {

inline constexpr int kPartitionFile = 1;
inline constexpr int kPartitionMetis5 = 2;
inline constexpr int kPartitionNoMetis = 3;
inline constexpr int kPartitionMetis4 = 4;
inline constexpr int kPartitionMultiLayer = 5;

inline constexpr int kWeightNone = 0;
inline constexpr int kWeightLayers = 1;
inline constexpr int kWeightFile = 3;

// Keys of the partitioning (header comment).
struct PartitionSettings {
  int number_of_domains = 16;          // copied from the DOMAIN key by the caller
  bool number_of_domains_given = false;  // the setup holds number_of_domains
  int type_of_partitioning = kPartitionMetis5;
  std::string file_name_partitioning;  // resolved against the setup file's folder
  int item_number_partitioning = 1;
  int type_of_weighting = kWeightNone;
  std::string file_name_weighting;
  int item_number_weighting = 1;
  int use_METIS5_options = 0;
  // Entries set by option_% keys, kMetisOptionCount long (kOptionNotGiven
  // elsewhere); empty when use_METIS5_options is 0.
  std::vector<int> metis5_options;
  int small_master_partition = 1;
  int write_partitioning = 0;
  int type_of_halo_layer = 2;
  std::string folder;   // of the setup file: the default partition file lies there
  std::string section;  // path of the section the keys came from (messages)
};

inline constexpr int kOptionNotGiven = -2147483647 - 1;
// Length of METIS 5's options array and the entry that sets its numbering
// (checked against metis.h where METIS is called).
inline constexpr int kMetisOptionCount = 40;
inline constexpr int kMetisOptionNumbering = 17;

// Keys option_k that set entry k of the METIS options array (1 .. 11, 16 .. 25).
bool IsMetisOptionKey(int k);

// Reads the keys above from the open section (the caller has the DOMAIN or
// Mesh section open). number_of_dimensions (2 or 3) sets the default weighting.
// An unknown type of partitioning or weighting, or a bad option key, stops
// the run naming the key and the section.
void ReadPartitionKeys(PartitionSettings& ps, int number_of_dimensions = 2);

}  // namespace vhd
