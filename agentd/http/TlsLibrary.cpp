// The bodies of the library's TLS part, compiled once.
#include <boost/asio/ssl/impl/src.hpp>
