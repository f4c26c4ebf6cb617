#pragma once
// The partition of a 2D mesh over the processes of a multi-process run: one
// sub-domain per process, sub-domain p (from 1) owned by process p - 1.
// The keys that steer it are read with the domain (mesh/partition_keys.hpp).
//
// Number of sub-domains. A run has one process per sub-domain. A partition
// file gives as many sub-domains as its largest number; `number_of_domains`,
// when the setup gives it and it is not 0, must equal that number ("Illegal
// number of partitions"). The computed types make one sub-domain per process;
// a `number_of_domains` given in the setup (not 0) must equal the process
// count. A partition whose count differs from the process count stops the run
// with a message naming both. A setup without `number_of_domains` (default 16)
// follows the process count, so setups written for one process run unchanged;
// a single process partitions nothing and needs no partition key.
//
// METIS 5 options. The array handed to METIS is METIS's own options array
// (METIS_NOPTIONS entries, index METIS_OPTION_*), unchanged. Defaults: every
// entry METIS's default (-1), then
//   PTYPE    k-way from 8 sub-domains on, recursive bisection below 8
//   UFACTOR  30 (imbalance 1.030) with k-way, 1 (1.001) with recursive bisection
//   OBJTYPE 0 (edge cut), NITER 20, NCUTS 5, SEED 5489, NUMBERING 0.
// Key option_k sets entry k of that array: option_1 OBJTYPE, option_2 CTYPE,
// option_3 IPTYPE, option_4 RTYPE, option_5 DBGLVL, option_6 NITER, option_7
// NCUTS, option_8 SEED, option_9 NO2HOP, option_10 MINCONN, option_11 CONTIG,
// option_16 UFACTOR, option_18 .. option_25 the entries after NUMBERING
// (METIS 5.1's partitioners do not read them; they are passed on). The
// entries 12 to 15 only steer fill-reducing orderings and have no key; entry 0
// (PTYPE) follows the number of sub-domains and option_17 (NUMBERING) must
// stay 0 (the graph is passed counting from 0). The partitioner chosen is the
// one PTYPE names. METIS seeds its own generator from SEED, so the same mesh
// and keys give the same partition on every process and in every run.
//
// The graph is the element graph of the 2D mesh: elements joined through
// their interior faces, in the mesh's element and face order.
//
// Partition file: a .zrnu flexible-mesh file titled "KX Partition", start
// time 1990-01-01 12:00:00, one time step, one element item "Partition" with
// the sub-domain number of every element, mesh and values in the mesh file's
// order (so it reads back onto the mesh however the run renumbered it). Its
// name is file_name_partitioning, or "partitioning_<number of sub-domains>.zrnu"
// beside the setup file. A partition read from a file is not written again.

#include <string>
#include <vector>

#include "core/array1.hpp"
#include "core/run.hpp"
#include "mesh/mesh.hpp"
#include "mesh/partition_keys.hpp"

namespace vhd {

// METIS 5 options array for a partition into nparts sub-domains (header
// comment): the defaults, then the entries the setup gave.
std::vector<int> Metis5Options(const PartitionSettings& ps, int nparts);

// Partition of a whole 2D mesh with its faces set up (the elements may be
// renumbered: elements.file_index maps position -> place in the mesh file)
// for a run of run.nprocesses processes: result[e] in 1 .. nprocesses for
// every element position e. nmachines: machines the processes run on (type
// 5); mesh3d: the layered mesh over `mesh` in a 3D run (weights by layers).
// Writes the log summary and, with write_partitioning, the partition file
// (process 0 or a single process only). Every check is a fatal error.
Array1<int> PartitionMesh(const Mesh& mesh, const PartitionSettings& ps, const RunControl& run,
                          int nmachines = 1, const Mesh* mesh3d = nullptr);

// Writes the partition file (header comment) of `partition` over `mesh`.
void WritePartitionFile(const Mesh& mesh, const Array1<int>& partition, const std::string& file_name);

}  // namespace vhd
