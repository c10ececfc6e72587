// SPDX-License-Identifier: Apache-2.0
/// @file
/// `Ref`, an intrusive counted reference, and `Object`, the base of the objects that have such references.

#pragma once

#include <tarvel/core/export.h>

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <type_traits>
#include <utility>

namespace Tarvel {

/// Base of the platform's shared objects, with a thread-safe count of the references to the object. An object starts
/// with no reference and is destroyed, through its virtual destructor, on the thread that releases the last one.
class TARVEL_API Object {
public:
  Object(const Object &) = delete;
  Object &operator=(const Object &) = delete;

  /// Adds one to the count.
  void AddRef() const noexcept { m_references.fetch_add(1, std::memory_order_relaxed); }

  /// Subtracts one from the count, and destroys the object at 0.
  void Release() const noexcept {
    if (m_references.fetch_sub(1, std::memory_order_acq_rel) == 1) {
      delete this;
    }
  }

protected:
  Object() noexcept = default;
  virtual ~Object();

private:
  mutable std::atomic<std::uint32_t> m_references{0};
};

/// A counted reference to a `T` that has `AddRef` and `Release` (an `Object`, or a node of an XML tree). May be null.
/// Copying shares the object, destroying releases it. One `Ref` is for one thread at a time; copies may be used on any
/// thread.
template <typename T>
class Ref {
public:
  /// The type of the object.
  using element_type = T;

  /// The null reference.
  constexpr Ref() noexcept = default;
  constexpr Ref(std::nullptr_t) noexcept {}

  /// Shares `object`, which may be null.
  explicit Ref(T *object) noexcept : m_object(object) {
    if (m_object) {
      m_object->AddRef();
    }
  }

  Ref(const Ref &other) noexcept : Ref(other.m_object) {}
  Ref(Ref &&other) noexcept : m_object(std::exchange(other.m_object, nullptr)) {}

  /// Shares the object of `other`, for example as its base class.
  template <typename U, typename = std::enable_if_t<std::is_convertible_v<U *, T *>>>
  Ref(const Ref<U> &other) noexcept : Ref(other.get()) {}

  /// Takes over the reference of `other`, which becomes null.
  template <typename U, typename = std::enable_if_t<std::is_convertible_v<U *, T *>>>
  Ref(Ref<U> &&other) noexcept : m_object(other.Detach()) {}

  ~Ref() {
    if (m_object) {
      m_object->Release();
    }
  }

  Ref &operator=(Ref other) noexcept {
    std::swap(m_object, other.m_object);
    return *this;
  }

  /// The object, or null. It is valid while there is a reference to it.
  T *get() const noexcept { return m_object; }
  /// The object, which must not be null.
  T &operator*() const noexcept { return *m_object; }
  T *operator->() const noexcept { return m_object; }
  /// Whether the reference is not null.
  explicit operator bool() const noexcept { return m_object != nullptr; }

  /// Releases the object; the reference becomes null.
  void reset() noexcept { *this = Ref(); }

  /// Returns the object and becomes null, without releasing the object: the caller then owns one count.
  [[nodiscard]] T *Detach() noexcept { return std::exchange(m_object, nullptr); }

  /// Whether both refer to the same object.
  template <typename U>
  friend bool operator==(const Ref &left, const Ref<U> &right) noexcept {
    return left.get() == right.get();
  }
  /// Whether they refer to different objects.
  template <typename U>
  friend bool operator!=(const Ref &left, const Ref<U> &right) noexcept {
    return left.get() != right.get();
  }

private:
  T *m_object = nullptr;
};

/// Makes a new `T` and the first reference to it.
template <typename T, typename... Args>
Ref<T> MakeRef(Args &&...args) {
  return Ref<T>(new T(std::forward<Args>(args)...));
}

/// Throws `TypeMismatchException`; the message contains the expected and the actual class.
[[noreturn]] TARVEL_API void ThrowTypeMismatch(const char *expected, const char *actual);

} // namespace Tarvel
