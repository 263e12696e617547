#include "otxctl/sim/KovaUuid.h"

#include <uuid/uuid.h>

#include <array>

namespace OtxCtl::Sim {

std::string KovaUuidOf(std::string_view host, std::string_view disk) {
  const std::string name = "kova:" + std::string(host) + "/" + std::string(disk);
  uuid_t bytes;
  uuid_generate_sha1(bytes, *uuid_get_template("url"), name.data(), name.size());
  std::array<char, UUID_STR_LEN> text{};
  uuid_unparse_lower(bytes, text.data());
  return text.data();
}

}  // namespace OtxCtl::Sim
