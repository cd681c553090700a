#ifndef ZRM_HOST_NODE_TYPE_H
#define ZRM_HOST_NODE_TYPE_H

namespace zrm::host {

/// The node type of the managed system: the part of its name behind the colon. Set on the initial
/// thread before any other thread exists, read-only afterwards.
namespace NodeType {

/// Sets the type (AGF_SetNodeType); at most 31 bytes are kept.
void set(const char* nodeType) noexcept;

/// The type set, else that of the environment variable CTREQ_NODETYPE, else "ZRM"; an empty type
/// counts as none. Valid until the next set or change of the environment.
const char* get() noexcept;

} // namespace NodeType

} // namespace zrm::host

#endif
