// DispatchObject: an API object the host drives only through the C interface
// (quillmere.h), the way a C program or a script would: created by ProgID,
// methods looked up by name, arguments given as texts and converted by the
// parameter types the interface describes.
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "command_registry.h"
#include "quillmere/quillmere.h"

namespace qm::cli {

// An argument as the user typed it. null_text: the word that stands for the
// null text (meaningful for a text parameter only; elsewhere the word itself
// is converted).
struct CallArgument {
  std::string text;
  bool null_text = false;
};

// A result as the C interface gives it back.
struct CallValue {
  int32_t type = QM_VT_EMPTY;  // QM_VT_I4, QM_VT_R8, QM_VT_BOOL or QM_VT_UTF8
  int32_t i4 = 0;
  double r8 = 0;
  int16_t boolean = 0;
  std::string text;
};

struct CallOutcome {
  enum class Status {
    Done,    // the method ran
    Failed,  // the method failed or refused: error holds its description
    Usage    // no call was made: unknown method, wrong count, a value that does not convert
  };
  Status status = Status::Done;
  bool has_result = false;  // the method has a result and it ran
  CallValue result;
  std::string error;
};

class DispatchObject {
 public:
  // name: "APICommand", "APISearch" (any case) or a ProgID. On failure
  // returns nothing and sets error.
  static std::optional<DispatchObject> Create(std::string_view name, std::string& error);

  // The versioned ProgID of the object's class.
  std::string ProgId() const;

  // Calls method (any case) with the arguments converted to its parameter types.
  CallOutcome Call(std::string_view method, const std::vector<CallArgument>& args);

  // Data path, group and (for an object that has the method) the data-source
  // connection of the global options, through the object's own methods.
  // False with error set when one fails.
  bool Apply(const GlobalOptions& options, std::string& error);

  // One line a method: "Name(Param: type, ...) -> type", in dispatch order.
  std::vector<std::string> MethodLines() const;

 private:
  struct Release {
    void operator()(qm_object* object) const { qm_release(object); }
  };
  explicit DispatchObject(qm_object* object) : object_(object) {}

  // "Name(Param: type, ...) -> type" for a known identifier.
  std::string Signature(int32_t dispid) const;
  // Whether the object's interface has the method.
  bool Has(std::string_view method) const;

  std::unique_ptr<qm_object, Release> object_;
};

// The value as a line of text: integers and doubles as numbers (doubles in
// their shortest exact form), booleans as true (-1), false (0) or, for any
// other value, its number; texts as they are.
std::string ValueText(const CallValue& value);

}  // namespace qm::cli
