// PiCmd: turns one command statement into a command record: the command type
// and the names, flags and definitions that the command engine carries out.
// It fills the engine's current findex definition, order definition and
// connection settings directly and never touches files or the database.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "command/command_type.h"
#include "command/connection_settings.h"
#include "format/index_options.h"
#include "format/index_header.h"
#include "format/order_info.h"

namespace qm {

class PiCmd {
 public:
  // A statement holds at most this many words; a longer one is refused.
  static constexpr std::size_t kMaxWords = 200;

  // The records and options belong to the engine and must outlive the translator.
  PiCmd(CIndexHeader& findex, COrderInfo& order, ConnectionSettings& connection,
        const IndexOptions& index_options, const OrderOptions& order_options);
  PiCmd(const PiCmd&) = delete;
  PiCmd& operator=(const PiCmd&) = delete;

  // Splits the statement as it is into words (no normalisation).
  void SplitStrW(std::u16string_view statement);

  // Resets the state, copies the current options into the definitions,
  // normalises, splits and translates. Raises the PiCmd family on a statement
  // it refuses; the definitions then keep what had been filled in before.
  void TranslateW(std::u16string_view statement);

  // CMD_TYPE: a CommandType, kCmdNotRecognised until a statement is recognised.
  int32_t CmdType() const { return cmd_type_; }
  int16_t Rebuild() const { return rebuild_; }
  int16_t Create() const { return create_; }
  // The key of DELETE FROM FINDEX.
  int32_t DeleteKeyValue() const { return delete_key_value_; }
  // CREATE INDEX / UPDATE INDEX: the statement as the host wrote it.
  const std::u16string& PassThroughSql() const { return pass_through_sql_; }
  std::size_t StatementWords() const { return words_.size(); }
  const std::u16string& Word(std::size_t i) const { return words_.at(i); }

 private:
  void Split(std::u16string_view statement, const char* method);
  void Translate(std::u16string_view statement);
  void TranslateCreateOrUpdate(std::u16string_view statement);
  void TranslateFindex();
  void TranslateOrder();
  void TranslateDrop();
  void TranslateConnect();
  void TranslateSet();
  void TranslateDelete();

  struct DefinitionWords {
    std::u16string table;
    std::u16string columns;  // the column words joined with nothing between them
    std::u16string key;
  };
  // Words 4 on of "... ON TABLE t COLUMNS c KEY k [REBUILD]"; sets Rebuild.
  DefinitionWords ReadDefinitionWords();
  template <class Definition, class NotOn>
  std::optional<DefinitionWords> ReadDefinitionOpening(Definition& definition, std::string& name,
                                                       std::string_view spaces_message,
                                                       int32_t stored_type, NotOn not_on);

  bool IsKeyword(std::size_t i, std::u16string_view keyword) const;
  // Raises error 13 when the statement ends before word i.
  void RequireWord(std::size_t i) const;

  CIndexHeader& findex_;
  COrderInfo& order_;
  ConnectionSettings& connection_;
  const IndexOptions& index_options_;
  const OrderOptions& order_options_;

  std::vector<std::u16string> words_;
  bool unterminated_quote_ = false;
  int32_t cmd_type_ = kCmdNotRecognised;
  int16_t rebuild_ = 0;
  int16_t create_ = 0;
  int32_t delete_key_value_ = 0;
  std::u16string pass_through_sql_;
};

// Raises the PiCmd text error message (method) when name holds a blank;
// used for findex and order names, which become file names.
void RequireNameWithoutSpaces(std::u16string_view name, std::string_view message,
                              const char* method);

inline constexpr std::string_view kSpacesInIndexName = "Spaces are not allowed in index names";
inline constexpr std::string_view kSpacesInOrderName = "Spaces are not allowed in order names";

}  // namespace qm
