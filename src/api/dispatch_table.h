// DispatchTable: the methods of one API class by dispatch identifier, with
// their parameter names and types, and a caller that converts checked
// argument values to the C++ method's parameters. The tables of APICommand
// and APISearch are the one description of both interfaces: the C interface
// dispatches through them and the type library is written from them.
#pragma once

#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <string_view>
#include <tuple>
#include <type_traits>
#include <utility>
#include <variant>
#include <vector>

#include "quillmere/automation.h"

namespace qm {

enum class DispatchType { Long, Double, Bool, Text };

struct DispatchParameter {
  std::string name;
  DispatchType type = DispatchType::Long;
  bool is_result = false;  // the method's [out, retval] parameter
};

// An argument after its checks, or a result: empty (a null text), a long, a
// double, a 16-bit boolean or a text.
using DispatchValue = std::variant<std::monostate, int32_t, double, int16_t, std::u16string>;

struct DispatchMethod {
  int32_t dispid = 0;
  std::string name;
  std::vector<DispatchParameter> parameters;  // in order, the result last
  // Calls the method on object with one value per in parameter, of the
  // parameter's type; result receives the out value when the call succeeded.
  std::function<HRESULT(void* object, const std::vector<DispatchValue>& args,
                        DispatchValue& result)>
      call;

  int32_t InCount() const {
    return static_cast<int32_t>(parameters.size()) - (HasResult() ? 1 : 0);
  }
  bool HasResult() const { return !parameters.empty() && parameters.back().is_result; }
};

class DispatchTable {
 public:
  DispatchTable(std::string prog_id, std::string interface_name,
                std::vector<DispatchMethod> methods);
  const std::string& ProgId() const { return prog_id_; }
  const std::string& InterfaceName() const { return interface_name_; }
  const std::vector<DispatchMethod>& Methods() const { return methods_; }
  // By identifier; null when there is none.
  const DispatchMethod* Find(int32_t dispid) const;
  // By name without regard to ASCII case; null when there is none.
  const DispatchMethod* Find(std::string_view name) const;

 private:
  std::string prog_id_;
  std::string interface_name_;
  std::vector<DispatchMethod> methods_;
};

const DispatchTable& APICommandDispatch();
const DispatchTable& APISearchDispatch();

namespace dispatch_detail {

template <class T>
struct Kind;
template <>
struct Kind<int32_t> {
  static constexpr DispatchType type = DispatchType::Long;
};
template <>
struct Kind<double> {
  static constexpr DispatchType type = DispatchType::Double;
};
template <>
struct Kind<VARIANT_BOOL> {
  static constexpr DispatchType type = DispatchType::Bool;
};
template <>
struct Kind<BSTR> {
  static constexpr DispatchType type = DispatchType::Text;
};

template <class P>
constexpr bool kIsOut = std::is_pointer_v<P> && !std::is_const_v<std::remove_pointer_t<P>>;

template <class P>
using Stored = std::remove_cv_t<std::remove_pointer_t<P>>;

// The in parameters: all but a last out parameter.
template <class... P>
constexpr std::size_t InCount() {
  if constexpr (sizeof...(P) == 0) {
    return 0;
  } else {
    return sizeof...(P) - (kIsOut<std::tuple_element_t<sizeof...(P) - 1, std::tuple<P...>>> ? 1 : 0);
  }
}

// An in argument as the method takes it; texts are held in the argument
// vector, so pointers to them stay valid for the call.
template <class P>
P InValue(const DispatchValue& value) {
  if constexpr (std::is_same_v<P, const BSTR*>) {
    return std::holds_alternative<std::u16string>(value) ? &std::get<std::u16string>(value)
                                                         : nullptr;
  } else if constexpr (std::is_same_v<P, VARIANT_BOOL>) {
    return std::get<int16_t>(value);
  } else {
    return std::get<P>(value);
  }
}

template <class Object, class... P, std::size_t... I>
HRESULT CallWith(Object& object, HRESULT (Object::*fn)(P...),
                 const std::vector<DispatchValue>& args, DispatchValue& result,
                 std::index_sequence<I...>) {
  constexpr std::size_t kCount = sizeof...(P);
  if constexpr (InCount<P...>() < kCount) {
    using Out = std::tuple_element_t<kCount - 1, std::tuple<P...>>;
    Stored<Out> out{};
    const HRESULT hr = (object.*fn)(InValue<std::tuple_element_t<I, std::tuple<P...>>>(args[I])...,
                                    &out);
    if (hr == S_OK) {
      if constexpr (std::is_same_v<Stored<Out>, VARIANT_BOOL>) {
        result = static_cast<int16_t>(out);
      } else {
        result = std::move(out);
      }
    }
    return hr;
  } else {
    return (object.*fn)(InValue<std::tuple_element_t<I, std::tuple<P...>>>(args[I])...);
  }
}

}  // namespace dispatch_detail

// A table entry for fn: names lists every parameter's name, the result's
// last. The parameter types come from fn's signature: an out parameter
// (a pointer to non-const) must be the last.
template <class Object, class... P>
DispatchMethod MethodEntry(int32_t dispid, std::string name, HRESULT (Object::*fn)(P...),
                           std::vector<std::string> names) {
  using namespace dispatch_detail;
  DispatchMethod method;
  method.dispid = dispid;
  method.name = std::move(name);
  std::size_t i = 0;
  (method.parameters.push_back(DispatchParameter{i < names.size() ? names[i++] : std::string(),
                                                 Kind<Stored<P>>::type, kIsOut<P>}),
   ...);
  constexpr std::size_t kIn = InCount<P...>();
  method.call = [fn](void* object, const std::vector<DispatchValue>& args,
                     DispatchValue& result) {
    return CallWith(*static_cast<Object*>(object), fn, args, result,
                    std::make_index_sequence<kIn>{});
  };
  return method;
}

}  // namespace qm
