// What is written on disks, byte by byte: just enough of each format to be known by it.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

namespace OtxCtl::Linux {

// The contents of a disk in memory.
class Image {
 public:
  explicit Image(std::size_t bytes = std::size_t{4} << 20U) : _bytes(bytes, '\0') {}

  const std::string& Bytes() const noexcept { return _bytes; }

  Image& Put(std::size_t at, std::string_view bytes) {
    _bytes.replace(at, bytes.size(), bytes);
    return *this;
  }
  // The lowest byte first.
  Image& PutNumber(std::size_t at, std::uint64_t number, std::size_t size) {
    for (std::size_t i = 0; i < size; ++i) {
      _bytes[at + i] = static_cast<char>(number >> (8 * i));
    }
    return *this;
  }

  Image& PutExt2(std::string_view label) {
    constexpr std::size_t superblock = 1024;
    return PutNumber(superblock + 4, _bytes.size() / 1024, 4)
        .PutNumber(superblock + 32, 8192, 4)
        .PutNumber(superblock + 56, 0xEF53, 2)
        .PutNumber(superblock + 76, 1, 4)
        .Put(superblock + 120, label);
  }
  Image& PutSwap(std::string_view label) {
    return PutNumber(1024, 1, 4).PutNumber(1028, 100, 4).Put(1052, label).Put(4086, "SWAPSPACE2");
  }
  Image& PutLuks() { return Put(0, std::string_view("LUKS\xBA\xBE\0\1", 8)); }
  // The checksum is wrong.
  Image& PutLvm() {
    return Put(512, "LABELONE").PutNumber(520, 1, 8).PutNumber(532, 32, 4).Put(536, "LVM2 001");
  }
  Image& PutRaid() {
    return PutNumber(4096, 0xA92B4EFC, 4).PutNumber(4100, 1, 4).PutNumber(4096 + 144, 8, 8);
  }
  Image& PutDosTable(unsigned char type = 0x83) {
    return PutNumber(446 + 4, type, 1)
        .PutNumber(446 + 8, 2048, 4)
        .PutNumber(446 + 12, 2048, 4)
        .PutNumber(510, 0xAA55, 2);
  }
  // With a protective table for those who do not know it.
  Image& PutGpt() {
    constexpr std::size_t sectorSize = 512;
    const std::uint64_t last = _bytes.size() / sectorSize - 1;
    constexpr std::size_t entriesSize = 128 * 128;
    PutDosTable(0xEE).PutNumber(446 + 8, 1, 4).PutNumber(446 + 12, last, 4);
    Put(2 * sectorSize,
        std::string_view("\xAF\x3D\xC6\x0F\x83\x84\x72\x47\x8E\x79\x3D\x69\xD8\x47\x7D\xE4", 16));
    PutNumber(2 * sectorSize + 16, 1, 8)
        .PutNumber(2 * sectorSize + 32, 2048, 8)
        .PutNumber(2 * sectorSize + 40, 4095, 8);
    Put(sectorSize, "EFI PART").PutNumber(sectorSize + 8, 0x10000, 4).PutNumber(sectorSize + 12, 92, 4);
    PutNumber(sectorSize + 24, 1, 8).PutNumber(sectorSize + 32, last, 8);
    PutNumber(sectorSize + 40, 34, 8)
        .PutNumber(sectorSize + 48, last - 34, 8)
        .Put(sectorSize + 56, "sixteen bytes id");
    PutNumber(sectorSize + 72, 2, 8).PutNumber(sectorSize + 80, 128, 4).PutNumber(sectorSize + 84, 128, 4);
    PutNumber(sectorSize + 88, Crc({_bytes.data() + 2 * sectorSize, entriesSize}), 4);
    return PutNumber(sectorSize + 16, Crc({_bytes.data() + sectorSize, 92}), 4);
  }

 private:
  static std::uint32_t Crc(std::string_view bytes) {
    std::uint32_t crc = ~std::uint32_t{0};
    for (const char byte : bytes) {
      crc ^= static_cast<unsigned char>(byte);
      for (int bit = 0; bit < 8; ++bit) {
        crc = (crc >> 1U) ^ ((crc & 1U) != 0 ? 0xEDB88320U : 0U);
      }
    }
    return ~crc;
  }

  std::string _bytes;
};

}  // namespace OtxCtl::Linux
