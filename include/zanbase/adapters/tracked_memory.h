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
#include <memory>
#include <memory_resource>
#include <new>
#include <type_traits>
#include <utility>

#include "zanbase/adapters/tracked_block.h"

/// @addtogroup adapters
/// @{

/// A memory resource that takes blocks from `upstream` and records them at one call site, by default the line
/// that makes the resource. Thread-safe if `upstream` is.
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

    bool do_is_equal(const std::pmr::memory_resource& other) const noexcept override {
        const auto* const tracked = dynamic_cast<const HTrackedResource*>(&other);
        return tracked != nullptr && tracked->mpoUpstream->is_equal(*mpoUpstream);
    }

    std::pmr::memory_resource* mpoUpstream;  // not owned
    HCallSite moSite;
};

/// An allocator that takes from `Upstream` and records at one call site. It has no default constructor:
/// constructed by a container it would record a line of the standard library. Thread-safe if `Upstream` is.
template <class T, class Upstream = std::allocator<T>>
class HTrackedAllocator {
    using Traits = std::allocator_traits<Upstream>;
    static_assert(std::is_same_v<typename Traits::pointer, T*>, "the tracker knows plain pointers only");

public:
    /// @cond
    using value_type = T;
    using propagate_on_container_copy_assignment = typename Traits::propagate_on_container_copy_assignment;
    using propagate_on_container_move_assignment = typename Traits::propagate_on_container_move_assignment;
    using propagate_on_container_swap = typename Traits::propagate_on_container_swap;
    using is_always_equal = typename Traits::is_always_equal;
    template <class Other>
    struct rebind {
        using other = HTrackedAllocator<Other, typename Traits::template rebind_alloc<Other>>;
    };
    /// @endcond

    /// Records at `site` what it takes from `upstream`.
    HTrackedAllocator(const HCallSite& site, const Upstream& upstream = Upstream())
        : moUpstream(upstream), moSite(site) {}
    /// For another type, the same site and a copy of the upstream.
    template <class Other, class OtherUpstream>
    HTrackedAllocator(const HTrackedAllocator<Other, OtherUpstream>& other) noexcept
        : moUpstream(other.GetUpstream()), moSite(other.GetSite()) {}

    /// Room for `count` objects.
    [[nodiscard]] T* allocate(std::size_t count) {
        return HTrackedAllocation(
            count * sizeof(T), moSite, [&] { return Traits::allocate(moUpstream, count); },
            [&](T* block) { Traits::deallocate(moUpstream, block, count); });
    }
    /// Gives the room back.
    void deallocate(T* block, std::size_t count) {
        HTrackedDeallocation(block, [&](T* given) { Traits::deallocate(moUpstream, given, count); });
    }

    /// For a copy of a container: the same site, and the upstream that `Upstream` selects for copies.
    [[nodiscard]] HTrackedAllocator select_on_container_copy_construction() const {
        return {moSite, Traits::select_on_container_copy_construction(moUpstream)};
    }

    /// What it takes from.
    [[nodiscard]] const Upstream& GetUpstream() const { return moUpstream; }
    /// Where it records.
    [[nodiscard]] const HCallSite& GetSite() const { return moSite; }

    /// Equal if the upstreams are; the site does not matter.
    friend bool operator==(const HTrackedAllocator& one, const HTrackedAllocator& other) {
        return one.moUpstream == other.moUpstream;
    }
    /// The opposite.
    friend bool operator!=(const HTrackedAllocator& one, const HTrackedAllocator& other) {
        return !(one == other);
    }

private:
    Upstream moUpstream;
    HCallSite moSite;
};

/// Destroys an object of `HMakeTracked`. Thread-safe for different objects. Requires: if `T` is a base of the
/// object's class, it has a virtual destructor.
template <class T>
struct HTrackedDelete {
    HTrackedDelete() = default;
    /// For a pointer to a base.
    template <class Derived, class = std::enable_if_t<std::is_convertible_v<Derived*, T*>>>
    HTrackedDelete(const HTrackedDelete<Derived>&) noexcept {}

    /// Destroys `object`, which is not null, and records that its block is given back.
    void operator()(T* object) const noexcept {
        const volatile void* block = object;
        if constexpr (std::is_polymorphic_v<T>) {
            block = dynamic_cast<const volatile void*>(object);  // of the whole object
        }
        object->~T();
        HTrackedDeallocation(const_cast<void*>(block), [](void* given) { ::operator delete(given); });
    }
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
    HTrackedPtr<T> object(::new (block.get()) T(std::forward<Arguments>(arguments)...));
    block.release();
    return object;
}

/// @}

#endif
