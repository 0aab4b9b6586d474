// How the API objects turn a failure into their result: the text goes to the
// trace log (always written), into the calling thread's error information
// with the object's ProgID as source, and the method returns DISP_E_EXCEPTION.
#pragma once

#include <string>
#include <string_view>

#include "quillmere/automation.h"

namespace qm {

class CExceptionBase;

// The text of a failure: the message chain up to level 100 (200 when that is
// empty), one message a line.
std::u16string FailureText(const CExceptionBase& error);

HRESULT ReportErrorText(std::u16string_view text, std::string_view trace_tag,
                        std::u16string_view prog_id);

}  // namespace qm
