// Keys of the partitioning, read with the domain.

#include "mesh/partition_keys.hpp"

#include "io/setup.hpp"
#include "log/log.hpp"

namespace vhd {

bool IsMetisOptionKey(int k) { return (k >= 1 && k <= 11) || (k >= 16 && k <= 25); }

void ReadPartitionKeys(PartitionSettings& ps, int number_of_dimensions) {
  ps.section = SktSectionPath();
  ps.folder = SktFolder();
  ps.number_of_domains_given = SktHasKeyword("number_of_domains");
  auto where = [&](const std::string& key, int value) {
    return ": " + key + " = " + std::to_string(value) + " in " + ps.section;
  };
  SktReadKeyword("type_of_partitioning", ps.type_of_partitioning, kPartitionMetis5);
  if (ps.type_of_partitioning < kPartitionFile || ps.type_of_partitioning > kPartitionMultiLayer)
    FatalError("Illegal type of partitioning" + where("type_of_partitioning", ps.type_of_partitioning) +
               " (1 file, 2 METIS 5, 3 without METIS, 4 METIS 4, 5 multi-layer METIS)");
  SktReadFileName("file_name_partitioning", ps.file_name_partitioning);
  SktReadKeyword("item_number_partitioning", ps.item_number_partitioning, 1);
  SktReadKeyword("type_of_weighting", ps.type_of_weighting, number_of_dimensions == 3 ? kWeightLayers : kWeightNone);
  if (ps.type_of_weighting != kWeightNone && ps.type_of_weighting != kWeightLayers &&
      ps.type_of_weighting != kWeightFile)
    FatalError("Illegal type of weighting" + where("type_of_weighting", ps.type_of_weighting) +
               " (0 none, 1 layers of the 3D mesh, 3 from a file)");
  SktReadFileName("file_name_weighting", ps.file_name_weighting);
  SktReadKeyword("item_number_weighting", ps.item_number_weighting, 1);
  SktReadKeyword("use_METIS5_options", ps.use_METIS5_options, 0);
  ps.metis5_options.clear();
  if (ps.use_METIS5_options > 0) {
    ps.metis5_options.assign(kMetisOptionCount, kOptionNotGiven);
    for (int k = 1; k < kMetisOptionCount; ++k) {
      const std::string key = "option_" + std::to_string(k);
      if (!IsMetisOptionKey(k) || !SktHasKeyword(key)) continue;
      SktReadKeyword(key, ps.metis5_options[static_cast<std::size_t>(k)]);
      if (k == kMetisOptionNumbering && ps.metis5_options[static_cast<std::size_t>(k)] != 0)
        FatalError("Illegal METIS option" + where(key, ps.metis5_options[static_cast<std::size_t>(k)]) +
                   " (the numbering of the graph must stay 0)");
    }
  }
  SktReadKeyword("small_master_partition", ps.small_master_partition, 1);
  if (ps.small_master_partition < 0)
    FatalError("Illegal share of the master partition" + where("small_master_partition", ps.small_master_partition) +
               " (0 or 1 equal loads, m >= 2 a share of 1/m)");
  SktReadKeyword("write_partitioning", ps.write_partitioning, 0);
  SktReadKeyword("type_of_halo_layer", ps.type_of_halo_layer, 2);
  if (ps.type_of_halo_layer != 1 && ps.type_of_halo_layer != 2)
    FatalError("Illegal type of halo layer" + where("type_of_halo_layer", ps.type_of_halo_layer) + " (1 or 2)");
}

}  // namespace vhd
