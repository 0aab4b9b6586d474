// The common body of CStr and CWStr: a growable text with the engine's own
// capacity rules (a default string reserves 200 units, one built from a text
// exactly its length + 1, appends grow to exactly what is needed).
#pragma once

#include <cstddef>
#include <cstdint>
#include <new>
#include <string>
#include <string_view>

#include "base/checked_allocation.h"
#include "base/exception_family.h"
#include "base/trace.h"

namespace qm {

// Names supplies the method names of the errors (kCtor, kSCopy, kSCopy0, kSCat,
// kAddChar, kGetChar, kReplaceChar, kReserve) and the trace tag of a failed
// construction (kTraceTag). Every failure is a general error of module "Value".
template <class Char, class Names>
class EngineString {
 public:
  using View = std::basic_string_view<Char>;
  using String = std::basic_string<Char>;

  EngineString() : capacity_(kDefaultCapacity) {
    try {
      ReserveChecked(text_, kDefaultCapacity);
    } catch (const std::bad_alloc&) {
      FailConstruction("Could not allocate memory 1, aborting");
    }
  }
  explicit EngineString(View text) : capacity_(text.size() + 1), is_set_(true) {
    try {
      ReserveChecked(text_, capacity_);
      text_.assign(text);
    } catch (const std::bad_alloc&) {
      FailConstruction("Could not allocate memory 2, aborting");
    }
  }
  explicit EngineString(const Char* text) : EngineString(View(text ? text : EmptyText())) {}

  // Assign text; grows to exactly its length + 1 when needed.
  void SCopy(View text) {
    GrowTo(text.size() + 1, Names::kSCopy);
    text_.assign(text);
    is_set_ = true;
  }
  // Assign the range [from, to) of source.
  void SCopy(View source, std::size_t from, std::size_t to) {
    if (from > to || to > source.size()) throw Exception::General(Names::kSCopy, nullptr);
    SCopy(source.substr(from, to - from));
  }
  // Assign the first n units of source.
  void SCopy0(View source, std::size_t n) {
    if (n > source.size()) throw Exception::General(Names::kSCopy0, nullptr);
    GrowTo(n + 1, Names::kSCopy0);
    text_.assign(source.substr(0, n));
    is_set_ = true;
  }
  // Append text; grows to exactly the new length + 1 (+1 more when terminating).
  void SCat(View text, bool terminate = true) {
    GrowTo(Length() + text.size() + 1 + (terminate ? 1 : 0), Names::kSCat);
    text_.append(text);
    is_set_ = true;
  }
  // Appends one unit; a full string grows to its length + 11.
  void AddChar(Char c) {
    if (Length() + 1 >= capacity_) GrowTo(Length() + 11, Names::kAddChar);
    text_.push_back(c);
    is_set_ = true;
  }
  // The unit at i for 0 <= i <= length (the terminating zero at length).
  Char GetChar(std::size_t i) const {
    if (i > Length()) throw Exception::General(Names::kGetChar, nullptr);
    return i == Length() ? Char(0) : text_[i];
  }
  void ReplaceChar(std::size_t i, Char c) {
    if (i >= Length()) throw Exception::General(Names::kReplaceChar, nullptr);
    text_[i] = c;
  }
  // Keeps the text while capacity >= n + 5; otherwise reallocates to n and empties it.
  void Reserve(std::size_t n) {
    if (n <= SIZE_MAX - 5 && capacity_ >= n + 5) return;
    try {
      if (n > SIZE_MAX - 5) throw std::bad_alloc();
      ReserveChecked(text_, n + 5);
    } catch (const std::bad_alloc&) {
      throw Exception::General(Names::kReserve, nullptr);
    }
    text_.clear();
    capacity_ = n;
  }
  // Removes units of set from the end (mode 1), the start (mode 2) or both (mode 0).
  void Trim(View set, int mode = 0) {
    if (mode == 0 || mode == 1) {
      const auto e = text_.find_last_not_of(set);
      text_.erase(e == String::npos ? 0 : e + 1);
    }
    if (mode == 0 || mode == 2) text_.erase(0, text_.find_first_not_of(set));
  }
  void Clear() {
    text_.clear();
    is_set_ = true;
  }

  std::size_t Length() const { return is_set_ ? text_.size() : 0; }
  std::size_t Capacity() const { return capacity_; }
  bool IsSet() const { return is_set_; }
  bool Empty() const { return Length() == 0; }
  const Char* c_str() const { return text_.c_str(); }
  View View_() const { return text_; }
  const String& Str() const { return text_; }

 protected:
  using Exception = CValueException;
  static constexpr std::size_t kDefaultCapacity = 200;

  void GrowTo(std::size_t units, const char* method) {
    if (capacity_ >= units) return;
    try {
      ReserveChecked(text_, units);
    } catch (const std::bad_alloc&) {
      throw Exception::General(method, nullptr);
    }
    capacity_ = units;
  }
  [[noreturn]] static void FailConstruction(std::string_view message) {
    Trace(true, Names::kTraceTag, message);
    throw Exception::General(Names::kCtor, nullptr);
  }
  static const Char* EmptyText() {
    static const Char empty[1] = {Char(0)};
    return empty;
  }

  String text_;
  std::size_t capacity_;
  bool is_set_ = false;
};

}  // namespace qm
