#include "text/remove_blocks.h"

namespace qm {

namespace {

template <class String, class View>
void RemoveBlocksIn(String& text, View open, View close) {
  if (open.empty()) return;
  const View all(text);
  std::size_t out = 0;
  std::size_t in = 0;
  while (in < all.size()) {
    const std::size_t hit = all.find(open, in);
    const std::size_t keep_end = hit == View::npos ? all.size() : hit;
    if (out != in) {
      String::traits_type::move(text.data() + out, text.data() + in, keep_end - in);
    }
    out += keep_end - in;
    if (hit == View::npos) break;
    const std::size_t stop = all.find(close, hit + open.size());
    in = stop == View::npos ? all.size() : stop + close.size();
  }
  text.resize(out);
}

}  // namespace

void RemoveBlocks(std::u16string& text, std::u16string_view open, std::u16string_view close) {
  RemoveBlocksIn(text, open, close);
}

void RemoveBlocks(std::string& text, std::string_view open, std::string_view close) {
  RemoveBlocksIn(text, open, close);
}

}  // namespace qm
