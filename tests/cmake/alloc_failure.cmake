# The allocation-failure sweep interposes the allocator of its own program (library code
# included, as it is linked statically) with the linker's --wrap, so that a test can fail
# the Nth allocation of the operation it runs. Under AddressSanitizer the real functions
# are the sanitizer's, so leaks after a failure are still found.
if(CMAKE_SIZEOF_VOID_P EQUAL 4)
    set(zal_size_mangling j)
else()
    set(zal_size_mangling m)
endif()
set(zal_wrapped malloc calloc realloc strdup strndup
    _Znw${zal_size_mangling} _Zna${zal_size_mangling}
    _Znw${zal_size_mangling}RKSt9nothrow_t _Zna${zal_size_mangling}RKSt9nothrow_t)
list(TRANSFORM zal_wrapped PREPEND "-Wl,--wrap=")
target_link_options(alloc_failure_test PRIVATE ${zal_wrapped})
