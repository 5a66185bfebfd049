#pragma once

// Marks a framework class or function as part of libtrelm's exported surface. Plug-ins are built
// with -fvisibility=hidden; every polymorphic framework class must carry this so that its typeinfo
// and vtable are the single copy in libtrelm and a message made in a plug-in is recognised by a
// dynamic_cast in the host (and the other way round).
#define TRELM_API __attribute__((visibility("default")))

// The same, as a standard attribute, for a declaration that carries other standard attributes
// (GCC takes no GNU attribute after a standard one): `class [[nodiscard, TRELM_API_ATTR]] X`.
#define TRELM_API_ATTR gnu::visibility("default")
