// The body of a request as the HTTP library reads it, within a budget. Part of the server; nobody else
// includes this.
#pragma once

#include <algorithm>
#include <boost/beast/core/buffers_range.hpp>
#include <boost/beast/core/buffers_to_string.hpp>
#include <boost/beast/http/error.hpp>
#include <boost/beast/http/message.hpp>
#include <boost/optional.hpp>
#include <cstdint>
#include <optional>
#include <string>

#include "agentd/http/BodyBudget.h"

namespace Agentd {

// A body that would take more than its share is the error that IsBeyondBudget knows.
struct HttpBody {
  using Error = boost::system::error_code;

  // NOLINTBEGIN(readability-identifier-naming): the library asks for these names

  struct value_type {
    std::string text = {};
    std::optional<BodyBudget::Share> share = std::nullopt;  // there before the first byte is read
  };

  static Error BeyondBudget() {
    return boost::system::errc::make_error_code(boost::system::errc::no_buffer_space);
  }
  static bool IsBeyondBudget(const Error& error) { return error == BeyondBudget(); }

  // How the library hands it over.
  class reader {
   public:
    template <bool isRequest, class Fields>
    reader(boost::beast::http::header<isRequest, Fields>&, value_type& body) : _body(body) {}

    void init(const boost::optional<std::uint64_t>& length, Error& error) {
      error = {};
      if (length) {
        MakeRoom(static_cast<std::size_t>(*length), error);
      }
    }

    template <class Buffers>
    std::size_t put(const Buffers& buffers, Error& error) {
      error = {};
      const std::size_t wanted = _body.text.size() + boost::beast::buffer_bytes(buffers);
      if (wanted > _body.text.capacity()) {
        MakeRoom(std::max(wanted, 2 * _body.text.size()), error);
      }
      if (error) {
        return 0;
      }
      for (const auto part : boost::beast::buffers_range_ref(buffers)) {
        _body.text.append(static_cast<const char*>(part.data()), part.size());
      }
      return boost::beast::buffer_bytes(buffers);
    }

    static void finish(Error& error) { error = {}; }

    // NOLINTEND(readability-identifier-naming)

   private:
    void MakeRoom(std::size_t bytes, Error& error) {
      if (_body.share->Hold(bytes)) {
        _body.text.reserve(bytes);
      } else {
        error = BeyondBudget();
      }
    }

    value_type& _body;
  };
};

}  // namespace Agentd
