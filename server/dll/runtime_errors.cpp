// The standard containers report their errors through these hooks. The runtime's own build
// an exception class carrying a copy-on-write string, which brings both of the runtime's
// string implementations with it: a tenth of the module, for a text no host ever reads.
// Every entry from a host catches whatever is thrown (base/boundary.h) and tells only
// "out of memory" from anything else, so these keep that distinction and no more.
// A container call that needs a hook not defined here pulls the runtime's file of them all,
// and the link fails on the duplicates: define the new one here too.
#include <exception>
#include <new>

namespace {
struct ContainerFault : std::exception {};
}  // namespace

namespace std {
void __throw_bad_alloc() { throw bad_alloc(); }
void __throw_bad_array_new_length() { throw bad_alloc(); }
// A size beyond what any allocation could hold.
void __throw_length_error(const char*) { throw bad_alloc(); }
void __throw_logic_error(const char*) { throw ContainerFault(); }
void __throw_out_of_range_fmt(const char*, ...) { throw ContainerFault(); }
void __throw_system_error(int) { throw ContainerFault(); }
}  // namespace std
