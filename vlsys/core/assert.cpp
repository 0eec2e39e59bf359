// With the C++ library's assertions on, a failed one calls a function of libstdc++, which nothing
// here is linked with.
#include <cstddef>
#include <cstdlib>

#if defined(_GLIBCXX_ASSERTIONS) && defined(_GLIBCXX_VERBOSE_ASSERT)

// Weak: a program that is linked with the static library may bring its own.
// NOLINTNEXTLINE(cert-dcl58-cpp)
[[gnu::weak]] void std::__glibcxx_assert_fail(const char * /*file*/, int /*line*/,
                                              const char * /*function*/,
                                              const char * /*condition*/) noexcept {
    abort();
}

#endif
