/// Whether this process can receive the kernel's FC events. The kernel sends them only in the first network namespace.
/// In any other one, for example in a container without the host's network, subscribing succeeds but no event ever
/// comes. Pure.
#ifndef LIBKPM_LINUX_SRC_NETWORKNAMESPACE_H
#define LIBKPM_LINUX_SRC_NETWORKNAMESPACE_H

#include <optional>
#include <string_view>

/// Looks for the kernel's own socket of this netlink family (sender 0) in the text of /proc/self/net/netlink: a table
/// with one line a socket, family and sender in the columns Eth and Pid. Only the first namespace has it. Nothing where
/// the text is not such a table.
std::optional<bool> hasKernelSocket(std::string_view aTable, unsigned aFamily);

#endif
