// The runtime's default terminate handler names the escaping exception's type on standard
// error, which no shell host reads; it brings the demangler and a printf with it, a tenth of
// the module. Defining the handler here keeps the runtime's own out of the link (its code
// can't be collected as unused: the unwind tables keep every function linked in).
// std::terminate still aborts.
#include <cstdlib>
#include <exception>

namespace __gnu_cxx {
void __verbose_terminate_handler() { std::abort(); }
}  // namespace __gnu_cxx
