// What a change is about to do, kept in a file until it is done: after a power cut it tells which disks'
// marks nobody else has made.
//
// Threads: any; one at a time writes.
#pragma once

#include <string>
#include <vector>

namespace OtxCtl::Linux {

class ChangeRecord {
 public:
  using Names = std::vector<std::string>;

  // Keeps nothing without a folder. The folder is made when it is needed.
  explicit ChangeRecord(std::string folder) : _folder(std::move(folder)) {}

  // Canonical names of disks. Throws std::runtime_error if there is a record that cannot be read.
  Names Read() const;
  // Adds these to what is recorded; it is on the disk when this returns. Throws std::runtime_error.
  void Add(const Names& disks) const;
  // Throws std::runtime_error.
  void Remove(const Names& disks) const;

 private:
  void Write(const Names& disks) const;

  const std::string _folder;
};

}  // namespace OtxCtl::Linux
