#ifndef ZRM_HOST_NODE_TYPE_H
#define ZRM_HOST_NODE_TYPE_H

namespace zrm::host {

/// The node type of the managed system: the part of its name after the colon. Set on the initial
/// thread before any other thread exists, read-only afterwards.
namespace NodeType {

/// Sets the type (AGF_SetNodeType); at most 31 bytes are kept.
void set(const char* nodeType) noexcept;

/// The type set, or else that of the environment variable CTREQ_NODETYPE, or else "ZRM"; an empty
/// type counts as not set. Valid until the next set or change of the environment.
const char* get() noexcept;

} // namespace NodeType

} // namespace zrm::host

#endif
