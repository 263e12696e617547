// The bodies of the HTTP and network library, compiled once.
#include <boost/asio/impl/src.hpp>
#include <boost/beast/src.hpp>
