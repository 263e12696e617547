// How much a reader accepts before it refuses. Every bound is inclusive: the value itself is accepted.
#pragma once

#include <cstddef>

namespace Orbis {

struct Limits {
  std::size_t documentBytes;
  std::size_t depth;       // nested elements, objects and arrays; the root is at depth 1
  std::size_t elements;    // elements of the whole document, or values of a JSON text
  std::size_t attributes;  // attributes of one element, namespace declarations included
  std::size_t nameBytes;   // a name with its namespace, or a JSON key
  std::size_t textBytes;   // one text or attribute value

  // For texts that anyone may have sent.
  static constexpr Limits Untrusted() {
    return {.documentBytes = 16u << 20,
            .depth = 64,
            .elements = 500'000,
            .attributes = 32,
            .nameBytes = 256,
            .textBytes = 1u << 20};
  }

  // For texts that our own program wrote. Roomy, but still bounds: a mistake must not eat the host.
  static constexpr Limits OwnOutput() {
    return {.documentBytes = 1u << 30,
            .depth = 512,
            .elements = 8'000'000,
            .attributes = 64,
            .nameBytes = 1024,
            .textBytes = 64u << 20};
  }
};

}  // namespace Orbis
