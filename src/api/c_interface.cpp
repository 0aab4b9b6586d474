// The C interface: objects by ProgID, calls by dispatch identifier through
// the classes' dispatch tables, results and error information for C hosts.
#include "quillmere/quillmere.h"

#include <atomic>
#include <cmath>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "api/dispatch_table.h"
#include "config/global_defs.h"
#include "platform/text_encoding.h"
#include "quillmere/api_command.h"
#include "quillmere/api_search.h"

struct qm_object {
  const qm::DispatchTable* table = nullptr;
  std::unique_ptr<qm::APICommand> command;
  std::unique_ptr<qm::APISearch> search;
  std::atomic<int32_t> references{1};

  void* Target() {
    return command ? static_cast<void*>(command.get()) : static_cast<void*>(search.get());
  }
};

namespace {

std::atomic<int32_t> g_objects{0};
std::atomic<int32_t> g_locks{0};

// What the thread's last call left in its error information.
thread_local std::string t_description;
thread_local std::string t_source;

constexpr const char16_t* kInterfaceSource = u"QuillmereAPI";

bool SameText(std::string_view a, std::string_view b) {
  return qm::ToUpper(qm::Utf8ToUtf16(a)) == qm::ToUpper(qm::Utf8ToUtf16(b));
}

// Starts a call: the thread's earlier error information is forgotten.
void BeginCall() {
  t_description.clear();
  t_source.clear();
  qm::ErrorInfo stale;
  qm::GetErrorInfo(stale);
}

// Ends a call: keeps what the call left in the thread's error information.
int32_t EndCall(int32_t hr) {
  qm::ErrorInfo info;
  if (qm::GetErrorInfo(info)) {
    t_description = qm::Utf16ToUtf8(info.Description);
    t_source = qm::Utf16ToUtf8(info.Source);
  }
  return hr;
}

// A failure found by this interface itself, before any method runs.
int32_t Fail(int32_t hr, const std::string& text, std::u16string_view source = kInterfaceSource) {
  qm::ErrorInfo info;
  info.Description = qm::Utf8ToUtf16(text);
  info.Source = std::u16string(source);
  qm::SetErrorInfo(info);
  return EndCall(hr);
}

const char* TypeName(qm::DispatchType type) {
  switch (type) {
    case qm::DispatchType::Long: return "an integer";
    case qm::DispatchType::Double: return "a number";
    case qm::DispatchType::Bool: return "a boolean";
    case qm::DispatchType::Text: return "a text";
  }
  return "a value";
}

int32_t VariantTypeOf(qm::DispatchType type) {
  switch (type) {
    case qm::DispatchType::Long: return QM_VT_I4;
    case qm::DispatchType::Double: return QM_VT_R8;
    case qm::DispatchType::Bool: return QM_VT_BOOL;
    case qm::DispatchType::Text: return QM_VT_UTF16;
  }
  return QM_VT_EMPTY;
}

// The argument as the parameter's type; false when it cannot be one.
bool Convert(const qm_variant& in, qm::DispatchType type, qm::DispatchValue& out) {
  switch (type) {
    case qm::DispatchType::Long:
      if (in.type == QM_VT_I4) {
        out = in.value.i4;
      } else if (in.type == QM_VT_BOOL) {
        out = static_cast<int32_t>(in.value.boolean);
      } else if (in.type == QM_VT_R8 && std::isfinite(in.value.r8) &&
                 std::trunc(in.value.r8) == in.value.r8 && in.value.r8 >= INT32_MIN &&
                 in.value.r8 <= INT32_MAX) {
        out = static_cast<int32_t>(in.value.r8);
      } else {
        return false;
      }
      return true;
    case qm::DispatchType::Double:
      if (in.type == QM_VT_R8) {
        out = in.value.r8;
      } else if (in.type == QM_VT_I4) {
        out = static_cast<double>(in.value.i4);
      } else {
        return false;
      }
      return true;
    case qm::DispatchType::Bool:
      // The low 16 bits as given: 1 is not VARIANT_TRUE.
      if (in.type == QM_VT_BOOL) {
        out = in.value.boolean;
      } else if (in.type == QM_VT_I4) {
        out = static_cast<int16_t>(in.value.i4);
      } else {
        return false;
      }
      return true;
    case qm::DispatchType::Text:
      if (in.type == QM_VT_EMPTY) {
        out = std::monostate{};
      } else if (in.type == QM_VT_UTF8) {
        if (in.value.utf8.data == nullptr) {
          if (in.value.utf8.length != 0) return false;
          out = std::u16string();
        } else {
          const std::size_t n = in.value.utf8.length != 0 ? in.value.utf8.length
                                                          : std::strlen(in.value.utf8.data);
          out = qm::Utf8ToUtf16(std::string_view(in.value.utf8.data, n));
        }
      } else if (in.type == QM_VT_UTF16) {
        const uint16_t* data = in.value.utf16.data;
        if (data == nullptr) {
          if (in.value.utf16.length != 0) return false;
          out = std::u16string();
        } else {
          std::size_t n = in.value.utf16.length;
          if (n == 0) {
            while (data[n] != 0) ++n;
          }
          out = std::u16string(reinterpret_cast<const char16_t*>(data), n);
        }
      } else {
        return false;
      }
      return true;
  }
  return false;
}

// The result into a variant the caller owns; texts become UTF-8 it frees
// with qm_variant_clear.
bool Store(const qm::DispatchValue& value, qm::DispatchType type, qm_variant& out) {
  // The variant is overwritten, not cleared: it may hold the caller's garbage.
  const int32_t byref = out.byref;
  std::memset(&out, 0, sizeof out);
  out.byref = byref;
  switch (type) {
    case qm::DispatchType::Long:
      out.type = QM_VT_I4;
      out.value.i4 = std::get<int32_t>(value);
      return true;
    case qm::DispatchType::Double:
      out.type = QM_VT_R8;
      out.value.r8 = std::get<double>(value);
      return true;
    case qm::DispatchType::Bool:
      out.type = QM_VT_BOOL;
      out.value.boolean = std::get<int16_t>(value);
      return true;
    case qm::DispatchType::Text: {
      const std::string text = std::holds_alternative<std::u16string>(value)
                                   ? qm::Utf16ToUtf8(std::get<std::u16string>(value))
                                   : std::string();
      char* copy = static_cast<char*>(std::malloc(text.size() + 1));
      if (copy == nullptr) return false;
      std::memcpy(copy, text.data(), text.size());
      copy[text.size()] = '\0';
      out.type = QM_VT_UTF8;
      out.owned = 1;
      out.value.utf8.data = copy;
      out.value.utf8.length = text.size();
      return true;
    }
  }
  return false;
}

const qm::DispatchMethod* MethodOf(const qm_object* object, int32_t dispid) {
  return object == nullptr ? nullptr : object->table->Find(dispid);
}

int32_t NoMethod(const qm_object* object, int32_t dispid) {
  if (object == nullptr) return Fail(QM_E_POINTER, "The object is null");
  return Fail(QM_DISP_E_MEMBERNOTFOUND, object->table->InterfaceName() +
                                            " has no method with dispatch identifier " +
                                            std::to_string(dispid));
}

}  // namespace

extern "C" {

int32_t qm_create(const char* prog_id, qm_object** object) {
  BeginCall();
  try {
    if (object == nullptr) return Fail(QM_E_POINTER, "qm_create: the object pointer is null");
    *object = nullptr;
    if (prog_id == nullptr) return Fail(QM_E_POINTER, "qm_create: the ProgID is null");
    auto made = std::make_unique<qm_object>();
    if (SameText(prog_id, QM_PROGID_APICOMMAND) ||
        SameText(prog_id, QM_PROGID_APICOMMAND_INDEPENDENT)) {
      made->table = &qm::APICommandDispatch();
      made->command = std::make_unique<qm::APICommand>();
    } else if (SameText(prog_id, QM_PROGID_APISEARCH) ||
               SameText(prog_id, QM_PROGID_APISEARCH_INDEPENDENT)) {
      made->table = &qm::APISearchDispatch();
      made->search = std::make_unique<qm::APISearch>();
    } else {
      return Fail(QM_REGDB_E_CLASSNOTREG,
                  std::string("No class is registered as ") + prog_id +
                      " (known: " QM_PROGID_APICOMMAND ", " QM_PROGID_APISEARCH ")");
    }
    *object = made.release();
    g_objects.fetch_add(1);
    return EndCall(QM_S_OK);
  } catch (...) {
    return Fail(QM_E_OUTOFMEMORY, "qm_create: out of memory");
  }
}

int32_t qm_add_ref(qm_object* object) {
  if (object == nullptr) return 0;
  return object->references.fetch_add(1) + 1;
}

int32_t qm_release(qm_object* object) {
  if (object == nullptr) return 0;
  const int32_t left = object->references.fetch_sub(1) - 1;
  if (left == 0) {
    // Destroying an object waits for its background jobs; nothing escapes.
    std::unique_ptr<qm_object> owned(object);
    owned.reset();
    g_objects.fetch_sub(1);
  }
  return left;
}

const char* qm_prog_id(const qm_object* object) {
  return object == nullptr ? "" : object->table->ProgId().c_str();
}

int32_t qm_get_dispid(const qm_object* object, const char* name, int32_t* dispid) {
  BeginCall();
  if (object == nullptr || name == nullptr || dispid == nullptr) {
    return Fail(QM_E_POINTER, "qm_get_dispid: a null pointer");
  }
  const qm::DispatchMethod* method = object->table->Find(std::string_view(name));
  if (method == nullptr) {
    return Fail(QM_DISP_E_UNKNOWNNAME,
                object->table->InterfaceName() + " has no method named " + name);
  }
  *dispid = method->dispid;
  return EndCall(QM_S_OK);
}

int32_t qm_method_name(const qm_object* object, int32_t dispid, const char** name,
                       int32_t* parameter_count) {
  BeginCall();
  const qm::DispatchMethod* method = MethodOf(object, dispid);
  if (method == nullptr) return NoMethod(object, dispid);
  if (name != nullptr) *name = method->name.c_str();
  if (parameter_count != nullptr) *parameter_count = static_cast<int32_t>(method->parameters.size());
  return EndCall(QM_S_OK);
}

int32_t qm_method_parameter(const qm_object* object, int32_t dispid, int32_t index,
                            const char** name, int32_t* type, int32_t* is_result) {
  BeginCall();
  const qm::DispatchMethod* method = MethodOf(object, dispid);
  if (method == nullptr) return NoMethod(object, dispid);
  if (index < 0 || index >= static_cast<int32_t>(method->parameters.size())) {
    return Fail(QM_E_INVALIDARG, method->name + " has no parameter " + std::to_string(index));
  }
  const qm::DispatchParameter& parameter = method->parameters[static_cast<std::size_t>(index)];
  if (name != nullptr) *name = parameter.name.c_str();
  if (type != nullptr) *type = VariantTypeOf(parameter.type);
  if (is_result != nullptr) *is_result = parameter.is_result ? 1 : 0;
  return EndCall(QM_S_OK);
}

int32_t qm_invoke(qm_object* object, int32_t dispid, qm_variant* args, int32_t arg_count,
                  qm_variant* result) {
  BeginCall();
  try {
    if (object == nullptr) return Fail(QM_E_POINTER, "qm_invoke: the object is null");
    const qm::DispatchMethod* method = object->table->Find(dispid);
    if (method == nullptr) return NoMethod(object, dispid);
    const int32_t in_count = method->InCount();
    // A by-ref argument may stand for the result, after the in arguments.
    qm_variant* out_argument = nullptr;
    if (method->HasResult() && arg_count == in_count + 1 && args != nullptr &&
        args[in_count].byref != 0) {
      out_argument = &args[in_count];
    } else if (arg_count != in_count) {
      return Fail(QM_DISP_E_BADPARAMCOUNT,
                  method->name + " takes " + std::to_string(in_count) + " argument" +
                      (in_count == 1 ? "" : "s") + ", " + std::to_string(arg_count) + " given");
    }
    if (in_count > 0 && args == nullptr) {
      return Fail(QM_E_POINTER, "qm_invoke: the arguments of " + method->name + " are null");
    }
    std::vector<qm::DispatchValue> values(static_cast<std::size_t>(in_count));
    for (int32_t i = 0; i < in_count; ++i) {
      const qm::DispatchParameter& parameter = method->parameters[static_cast<std::size_t>(i)];
      if (!Convert(args[i], parameter.type, values[static_cast<std::size_t>(i)])) {
        return Fail(QM_DISP_E_TYPEMISMATCH,
                    "Argument " + std::to_string(i + 1) + " (" + parameter.name + ") of " +
                        method->name + " must be " + TypeName(parameter.type));
      }
    }
    qm::DispatchValue value;
    const qm::HRESULT hr = method->call(object->Target(), values, value);
    if (hr == qm::S_OK && method->HasResult()) {
      const qm::DispatchType type = method->parameters.back().type;
      if ((result != nullptr && !Store(value, type, *result)) ||
          (out_argument != nullptr && !Store(value, type, *out_argument))) {
        return Fail(QM_E_OUTOFMEMORY, "qm_invoke: out of memory for the result");
      }
    }
    return EndCall(hr);
  } catch (...) {
    return Fail(QM_E_OUTOFMEMORY, "qm_invoke: out of memory");
  }
}

void qm_variant_clear(qm_variant* variant) {
  if (variant == nullptr) return;
  if (variant->owned != 0 && variant->type == QM_VT_UTF8) {
    std::free(const_cast<char*>(variant->value.utf8.data));
  }
  const int32_t byref = variant->byref;
  std::memset(variant, 0, sizeof *variant);
  variant->byref = byref;
}

const char* qm_error_description(void) { return t_description.c_str(); }

const char* qm_error_source(void) { return t_source.c_str(); }

int32_t qm_lock_server(int32_t lock) {
  return lock != 0 ? g_locks.fetch_add(1) + 1 : g_locks.fetch_sub(1) - 1;
}

int32_t qm_object_count(void) { return g_objects.load(); }

int32_t qm_can_unload_now(void) {
  return g_objects.load() == 0 && g_locks.load() == 0 ? QM_S_OK : QM_S_FALSE;
}

const char* qm_version(void) { return qm::CGlobalDefs::kVersionText; }

}  // extern "C"
