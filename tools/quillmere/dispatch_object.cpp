#include "dispatch_object.h"

#include <charconv>
#include <cmath>
#include <cstdio>
#include <optional>

#include "host_session.h"
#include "platform/text_encoding.h"

namespace qm::cli {

namespace {

bool SameText(std::string_view a, std::string_view b) { return ToUpper(a) == ToUpper(b); }

const char* TypeWord(int32_t type) {
  switch (type) {
    case QM_VT_I4: return "integer";
    case QM_VT_R8: return "number";
    case QM_VT_BOOL: return "boolean";
    default: return "text";
  }
}

// What a value of the type is written as, for messages.
const char* TypeHint(int32_t type) {
  switch (type) {
    case QM_VT_I4: return "an integer";
    case QM_VT_R8: return "a number";
    case QM_VT_BOOL: return "a boolean (true, false, or a number such as -1, 0 or 1)";
    default: return "a text";
  }
}

template <class Number>
std::optional<Number> WholeText(std::string_view text) {
  Number value{};
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
  if (text.empty() || error != std::errc() || end != text.data() + text.size()) {
    return std::nullopt;
  }
  return value;
}

// The argument as a variant of the parameter's type; false when the text is
// not one. A text variant points into argument, which must outlive the call.
bool ToVariant(const CallArgument& argument, int32_t type, qm_variant& out) {
  out = qm_variant{};
  const std::string_view text = argument.text;
  switch (type) {
    case QM_VT_I4: {
      const auto value = WholeText<int32_t>(text);
      if (!value) return false;
      out.type = QM_VT_I4;
      out.value.i4 = *value;
      return true;
    }
    case QM_VT_R8: {
      const auto value = WholeText<double>(text);
      if (!value || !std::isfinite(*value)) return false;
      out.type = QM_VT_R8;
      out.value.r8 = *value;
      return true;
    }
    case QM_VT_BOOL: {
      // A number passes as given: the methods tell -1 (true) from 1.
      std::optional<int32_t> value = WholeText<int32_t>(text);
      if (SameText(text, "true")) value = -1;
      if (SameText(text, "false")) value = 0;
      if (!value || *value < INT16_MIN || *value > INT16_MAX) return false;
      out.type = QM_VT_BOOL;
      out.value.boolean = static_cast<int16_t>(*value);
      return true;
    }
    default:
      if (argument.null_text) {
        out.type = QM_VT_EMPTY;
        return true;
      }
      // Length 0 would mean "up to the first zero": an empty text needs no more.
      out.type = QM_VT_UTF8;
      out.value.utf8.data = argument.text.c_str();
      out.value.utf8.length = argument.text.size();
      return true;
  }
}

// Frees what the library allocated for a result when the call is over.
struct ClearedVariant {
  qm_variant variant{};
  ~ClearedVariant() { qm_variant_clear(&variant); }
};

CallValue ValueOf(const qm_variant& variant) {
  CallValue value;
  value.type = variant.type;
  switch (variant.type) {
    case QM_VT_I4: value.i4 = variant.value.i4; break;
    case QM_VT_R8: value.r8 = variant.value.r8; break;
    case QM_VT_BOOL: value.boolean = variant.value.boolean; break;
    case QM_VT_UTF8:
      if (variant.value.utf8.data != nullptr) {
        value.text.assign(variant.value.utf8.data, variant.value.utf8.length);
      }
      break;
    default: break;
  }
  return value;
}

std::string Plural(int32_t count) {
  return std::to_string(count) + (count == 1 ? " argument" : " arguments");
}

}  // namespace

std::optional<DispatchObject> DispatchObject::Create(std::string_view name,
                                                     std::string& error) {
  std::string prog_id(name);
  if (SameText(name, "APICommand")) prog_id = QM_PROGID_APICOMMAND_INDEPENDENT;
  if (SameText(name, "APISearch")) prog_id = QM_PROGID_APISEARCH_INDEPENDENT;
  qm_object* object = nullptr;
  if (qm_create(prog_id.c_str(), &object) != QM_S_OK) {
    error = qm_error_description();
    return std::nullopt;
  }
  return DispatchObject(object);
}

std::string DispatchObject::ProgId() const { return qm_prog_id(object_.get()); }

bool DispatchObject::Has(std::string_view method) const {
  int32_t dispid = 0;
  return qm_get_dispid(object_.get(), std::string(method).c_str(), &dispid) == QM_S_OK;
}

std::string DispatchObject::Signature(int32_t dispid) const {
  const char* name = nullptr;
  int32_t count = 0;
  if (qm_method_name(object_.get(), dispid, &name, &count) != QM_S_OK) return {};
  std::string line = std::string(name) + "(";
  std::string result;
  for (int32_t i = 0; i < count; ++i) {
    const char* parameter = nullptr;
    int32_t type = 0;
    int32_t is_result = 0;
    qm_method_parameter(object_.get(), dispid, i, &parameter, &type, &is_result);
    if (is_result != 0) {
      result = std::string(" -> ") + TypeWord(type);
      continue;
    }
    if (i > 0) line += ", ";
    line += std::string(parameter) + ": " + TypeWord(type);
  }
  return line + ")" + result;
}

std::vector<std::string> DispatchObject::MethodLines() const {
  std::vector<std::string> lines;
  for (int32_t dispid = 1;; ++dispid) {
    std::string line = Signature(dispid);
    if (line.empty()) break;
    lines.push_back(std::move(line));
  }
  return lines;
}

CallOutcome DispatchObject::Call(std::string_view method,
                                 const std::vector<CallArgument>& args) {
  CallOutcome outcome;
  const auto usage = [&](std::string text) {
    outcome.status = CallOutcome::Status::Usage;
    outcome.error = std::move(text);
    return outcome;
  };
  int32_t dispid = 0;
  if (qm_get_dispid(object_.get(), std::string(method).c_str(), &dispid) != QM_S_OK) {
    return usage(qm_error_description());
  }
  const char* name = nullptr;
  int32_t count = 0;
  qm_method_name(object_.get(), dispid, &name, &count);
  std::vector<int32_t> types;
  bool has_result = false;
  for (int32_t i = 0; i < count; ++i) {
    int32_t type = 0;
    int32_t is_result = 0;
    qm_method_parameter(object_.get(), dispid, i, nullptr, &type, &is_result);
    if (is_result != 0) {
      has_result = true;
    } else {
      types.push_back(type);
    }
  }
  const auto in_count = static_cast<int32_t>(types.size());
  if (static_cast<int32_t>(args.size()) != in_count) {
    return usage(std::string(name) + " takes " + Plural(in_count) + ", " +
                 std::to_string(args.size()) + " given: " + Signature(dispid));
  }
  std::vector<qm_variant> variants(args.size());
  for (std::size_t i = 0; i < args.size(); ++i) {
    if (!ToVariant(args[i], types[i], variants[i])) {
      const char* parameter = nullptr;
      qm_method_parameter(object_.get(), dispid, static_cast<int32_t>(i), &parameter, nullptr,
                          nullptr);
      return usage("argument " + std::to_string(i + 1) + " (" + parameter + ") of " + name +
                   " must be " + TypeHint(types[i]) + ", not '" + args[i].text + "'");
    }
  }
  ClearedVariant result;
  const int32_t hr = qm_invoke(object_.get(), dispid, variants.data(), in_count,
                               has_result ? &result.variant : nullptr);
  const std::string description = qm_error_description();
  // A method that refuses still answers S_OK: only its error information
  // tells, and its result was never set.
  if (hr != QM_S_OK || !description.empty()) {
    outcome.status = CallOutcome::Status::Failed;
    if (description.empty()) {
      char code[16];
      std::snprintf(code, sizeof code, "0x%08X", static_cast<unsigned>(hr));
      outcome.error = std::string(name) + " failed with code " + code;
    } else {
      outcome.error = description;
    }
    return outcome;
  }
  outcome.has_result = has_result;
  if (has_result) outcome.result = ValueOf(result.variant);
  return outcome;
}

bool DispatchObject::Apply(const GlobalOptions& options, std::string& error) {
  const auto run = [&](std::string_view method, std::vector<CallArgument> args) {
    const CallOutcome outcome = Call(method, args);
    if (outcome.status == CallOutcome::Status::Done) return true;
    error = std::string(method) + ": " + outcome.error;
    return false;
  };
  if (!options.data_dir.empty() && !run("SetDataPath", {{options.data_dir}})) return false;
  if (!options.group.empty() && !run("SetGroup", {{options.group}})) return false;
  // Only the command object reads a data source.
  if (!Has("SetDBConnectionStringEx")) return true;
  if (!options.connect.empty()) {
    return run("SetDBConnectionStringEx", {{options.connect}, {std::string(), true}});
  }
  if (!options.dsn.empty()) {
    return run("SetDBConnectionStringEx",
               {{DsnConnectionString(options.dsn, options.user, options.password)},
                {options.dsn}});
  }
  return true;
}

std::string ValueText(const CallValue& value) {
  switch (value.type) {
    case QM_VT_I4: return std::to_string(value.i4);
    case QM_VT_R8: {
      char buffer[32];
      const auto end = std::to_chars(buffer, buffer + sizeof buffer, value.r8).ptr;
      return std::string(buffer, end);
    }
    case QM_VT_BOOL:
      if (value.boolean == -1) return "true";
      if (value.boolean == 0) return "false";
      return std::to_string(value.boolean);
    case QM_VT_UTF8: return value.text;
    default: return {};
  }
}

}  // namespace qm::cli
