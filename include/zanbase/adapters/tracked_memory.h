/// @file
/// Memory that is recorded in the allocation tracker by itself: a memory resource, an allocator and an owning
/// pointer.
///
///     HTrackedResource memory;                          // blocks are recorded at this file and line
///     std::pmr::vector<int> numbers(&memory);
///
///     std::vector<int, HTrackedAllocator<int>> more(HCallSite::Here());
///     HTrackedPtr<Widget> widget = HMakeTracked<Widget>(HCallSite::Here(), 3, "three");
///
/// All of them record as zanbase/adapters/tracked_block.h says. If the tracker has no memory for a record, the
/// block is given back and `std::bad_alloc` reaches the caller. What is freed and was never recorded (because
/// it was allocated during a pause, or the tables were reset) is given back all the same.
///
/// examples/adapters/tracked_memory.cpp shows all of them.
#ifndef ZANBASE_ADAPTERS_TRACKED_MEMORY_H
#define ZANBASE_ADAPTERS_TRACKED_MEMORY_H

#include <cstddef>
#include <cstdlib>
#include <memory>
#include <new>
#include <type_traits>
#include <utility>

#if __has_include(<memory_resource>)
#include <memory_resource>
#endif

#include "zanbase/adapters/tracked_block.h"

/// @addtogroup adapters
/// @{

#ifdef __cpp_lib_memory_resource
/// A memory resource that takes blocks from `upstream` and records them at one call site, by default the line
/// that makes the resource. `std::make_unique` and the like would make it on a line of the standard library: pass
/// them `HCallSite::Here()`. Thread-safe if `upstream` is.
class HTrackedResource : public std::pmr::memory_resource {
public:
    /// Takes from the default resource of the moment.
    explicit HTrackedResource(const HCallSite& site = HCallSite::Here())
        : HTrackedResource(std::pmr::get_default_resource(), site) {}
    /// Takes from `upstream`, which is not null and outlives this resource.
    explicit HTrackedResource(std::pmr::memory_resource* upstream, const HCallSite& site = HCallSite::Here())
        : mpoUpstream(upstream), moSite(site) {}

private:
    void* do_allocate(std::size_t bytes, std::size_t alignment) override {
        return HTrackedAllocation(
            bytes, moSite, [&] { return mpoUpstream->allocate(bytes, alignment); },
            [&](void* block) { mpoUpstream->deallocate(block, bytes, alignment); });
    }

    void do_deallocate(void* block, std::size_t bytes, std::size_t alignment) override {
        HTrackedDeallocation(block, [&](void* given) { mpoUpstream->deallocate(given, bytes, alignment); });
    }

    // Without type information two resources over one upstream count as different; containers then move element by
    // element between them.
    bool do_is_equal(const std::pmr::memory_resource& other) const noexcept override {
#ifdef __cpp_rtti
        const auto* const tracked = dynamic_cast<const HTrackedResource*>(&other);
        return tracked != nullptr && tracked->mpoUpstream->is_equal(*mpoUpstream);
#else
        return this == &other;
#endif
    }

    std::pmr::memory_resource* mpoUpstream;  // not owned
    HCallSite moSite;
};
#endif

/// An allocator that takes from `Upstream` and records at one call site. Everything else is as `Upstream` does it:
/// how elements are constructed and destroyed, and which allocator a container has after a copy, move or swap.
/// Thread-safe if `Upstream` is.
template <class T, class Upstream = std::allocator<T>>
class HTrackedAllocator {
    using Traits = std::allocator_traits<Upstream>;
    static_assert(std::is_same_v<typename Traits::pointer, T*>, "the tracker knows plain pointers only");
    static_assert(std::is_same_v<typename Traits::value_type, T>, "the upstream allocates another type");

public:
    /// @cond
    using value_type = T;
    using size_type = typename Traits::size_type;
    using difference_type = typename Traits::difference_type;
    using propagate_on_container_copy_assignment = typename Traits::propagate_on_container_copy_assignment;
    using propagate_on_container_move_assignment = typename Traits::propagate_on_container_move_assignment;
    using propagate_on_container_swap = typename Traits::propagate_on_container_swap;
    using is_always_equal = typename Traits::is_always_equal;
    template <class Other>
    struct rebind {
        using other = HTrackedAllocator<Other, typename Traits::template rebind_alloc<Other>>;
    };
    /// @endcond

    /// Records at "allocator without a call site", line 0: an allocator made inside the standard library has no line
    /// of the program. Pass one with a site to each container.
    HTrackedAllocator() : HTrackedAllocator(HCallSite{"allocator without a call site", 0}) {}
    /// Records at `site` what it takes from `upstream`.
    HTrackedAllocator(const HCallSite& site, const Upstream& upstream = Upstream())
        : moUpstream(upstream), moSite(site) {}
    /// For another type, the same site and a copy of the upstream.
    template <class Other, class OtherUpstream,
              class = std::enable_if_t<std::is_constructible_v<Upstream, const OtherUpstream&>>>
    HTrackedAllocator(const HTrackedAllocator<Other, OtherUpstream>& other) noexcept
        : moUpstream(other.GetUpstream()), moSite(other.GetSite()) {}

    /// Room for `count` objects.
    [[nodiscard]] T* allocate(size_type count) {
        // Where the product would overflow, the upstream throws.
        const std::size_t bytes =
            count * sizeof(T);  // NOLINT(bugprone-sizeof-expression): T may be a pointer
        return HTrackedAllocation(
            bytes, moSite, [&] { return Traits::allocate(moUpstream, count); },
            [&](T* block) { Traits::deallocate(moUpstream, block, count); });
    }
    /// Gives the room back.
    void deallocate(T* block, size_type count) {
        HTrackedDeallocation(block, [&](T* given) { Traits::deallocate(moUpstream, given, count); });
    }
    /// The largest count.
    [[nodiscard]] size_type max_size() const noexcept { return Traits::max_size(moUpstream); }

    /// Constructs an object as the upstream does: a `std::pmr::polymorphic_allocator` passes its resource on.
    template <class Object, class... Arguments>
    void construct(Object* place, Arguments&&... arguments) {
        Traits::construct(moUpstream, place, std::forward<Arguments>(arguments)...);
    }
    /// Destroys an object as the upstream does.
    template <class Object>
    void destroy(Object* object) {
        Traits::destroy(moUpstream, object);
    }

    /// For a copy of a container: the same site, and the upstream that `Upstream` selects for copies.
    [[nodiscard]] HTrackedAllocator select_on_container_copy_construction() const {
        return {moSite, Traits::select_on_container_copy_construction(moUpstream)};
    }

    /// What it takes from.
    [[nodiscard]] const Upstream& GetUpstream() const noexcept { return moUpstream; }
    /// Where it records.
    [[nodiscard]] const HCallSite& GetSite() const noexcept { return moSite; }

private:
    Upstream moUpstream;
    HCallSite moSite;
};

/// Equal if the upstreams are; the site does not matter. Thread-safe, as any plain value.
template <class T, class Upstream, class Other, class OtherUpstream>
bool operator==(const HTrackedAllocator<T, Upstream>& one,
                const HTrackedAllocator<Other, OtherUpstream>& other) {
    return one.GetUpstream() == Upstream(other.GetUpstream());
}
/// The opposite. Thread-safe, as any plain value.
template <class T, class Upstream, class Other, class OtherUpstream>
bool operator!=(const HTrackedAllocator<T, Upstream>& one,
                const HTrackedAllocator<Other, OtherUpstream>& other) {
    return !(one == other);
}

/// Destroys an object of `HMakeTracked`, whichever of its bases `T` is: it knows the block and the class of the whole
/// object. Thread-safe for different objects.
template <class T>
class HTrackedDelete {
public:
    /// For a pointer that owns nothing, or an object of exactly the class `T`.
    HTrackedDelete() = default;
    /// For a pointer to a base.
    template <class Derived, class = std::enable_if_t<std::is_convertible_v<Derived*, T*>>>
    HTrackedDelete(const HTrackedDelete<Derived>& other) noexcept
        : mpWhole(other.mpWhole), mpfnDestroy(other.mpfnDestroy) {}

    /// Destroys `object`, which is not null, and records that its block is given back.
    void operator()(T* object) const noexcept {
        void* const whole = mpWhole != nullptr ? mpWhole : const_cast<std::remove_cv_t<T>*>(object);
        if (mpfnDestroy != nullptr) {
            mpfnDestroy(whole);
        } else if constexpr (std::is_destructible_v<T>) {
            object->~T();
        }
        HTrackedDeallocation(whole, [](void* given) { ::operator delete(given); });
    }

private:
    template <class Other>
    friend class HTrackedDelete;
    template <class Object, class... Arguments>
    friend std::unique_ptr<Object, HTrackedDelete<Object>> HMakeTracked(const HCallSite& site,
                                                                        Arguments&&... arguments);

    explicit HTrackedDelete(void* whole) noexcept
        : mpWhole(whole), mpfnDestroy([](void* object) { static_cast<T*>(object)->~T(); }) {}

    // Of the object as it was made; null in a default deleter.
    void* mpWhole = nullptr;
    void (*mpfnDestroy)(void*) = nullptr;
};

/// Owns one object that the tracker knows. For arrays use a container.
template <class T>
using HTrackedPtr = std::unique_ptr<T, HTrackedDelete<T>>;

/// Makes a `T` of `arguments` and records its block at `site`. Thread-safe.
template <class T, class... Arguments>
[[nodiscard]] HTrackedPtr<T> HMakeTracked(const HCallSite& site, Arguments&&... arguments) {
    static_assert(!std::is_array_v<T>, "for an array use a container");
    static_assert(alignof(T) <= __STDCPP_DEFAULT_NEW_ALIGNMENT__, "for a stricter alignment use a container");
    using Block = std::unique_ptr<void, void (*)(void*)>;
    Block block(
        HTrackedAllocation(
            sizeof(T), site, [] { return ::operator new(sizeof(T)); },
            [](void* failed) { ::operator delete(failed); }),
        [](void* unused) { HTrackedDeallocation(unused, [](void* given) { ::operator delete(given); }); });
    T* const object = ::new (block.get()) T(std::forward<Arguments>(arguments)...);
    return HTrackedPtr<T>(object, HTrackedDelete<T>(block.release()));
}

/// @}

#endif
