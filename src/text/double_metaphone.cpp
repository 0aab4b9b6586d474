#include "text/double_metaphone.h"

#include <initializer_list>

namespace qm::text {

namespace {

// The algorithm reads the word as if five spaces followed it; several of its
// tests look for a space right after the word's end.
constexpr int kPadding = 5;

class Encoder {
 public:
  Encoder(std::u16string_view word, std::u16string& out)
      : word_(word), length_(static_cast<int>(word.size())), last_(length_ - 1), out_(out) {
    slavo_germanic_ = Contains(u"W") || Contains(u"K") || Contains(u"CZ") || Contains(u"WITZ");
  }

  void Run();

 private:
  char16_t At(int pos) const {
    if (pos < 0) return 0;
    if (pos < length_) return word_[static_cast<std::size_t>(pos)];
    return pos < length_ + kPadding ? u' ' : 0;
  }
  bool StringAt(int start, int count, std::initializer_list<const char*> options) const {
    if (start < 0 || start >= length_ + kPadding) return false;
    for (const char* option : options) {
      int i = 0;
      while (i < count && At(start + i) == static_cast<char16_t>(option[i])) ++i;
      if (i == count) return true;
    }
    return false;
  }
  bool IsVowel(int pos) const {
    if (pos < 0 || pos >= length_) return false;
    switch (At(pos)) {
      case u'A': case u'E': case u'I': case u'O': case u'U': case u'Y':
        return true;
      default:
        return false;
    }
  }
  bool Contains(std::u16string_view part) const {
    return word_.find(part) != std::u16string_view::npos;
  }
  void Add(const char16_t* code) { out_.append(code); }

  int C(int current);
  int D(int current);
  int G(int current);
  int J(int current);
  int L(int current);
  int S(int current);
  int T(int current);
  int W(int current);

  std::u16string_view word_;
  int length_;
  int last_;
  std::u16string& out_;
  bool slavo_germanic_ = false;
};

void Encoder::Run() {
  int current = 0;
  // Silent first letter of GN, KN, PN, WR, PS.
  if (StringAt(0, 2, {"GN", "KN", "PN", "WR", "PS"})) current = 1;
  // An initial X sounds as S (Xavier).
  if (At(0) == u'X') {
    Add(u"S");
    current = 1;
  }
  while (current < length_) {
    switch (At(current)) {
      case u'A': case u'E': case u'I': case u'O': case u'U': case u'Y':
        if (current == 0) Add(u"A");
        ++current;
        break;
      case u'B':
        Add(u"P");
        current += At(current + 1) == u'B' ? 2 : 1;
        break;
      case u'\u00C7':  // Ç
        Add(u"S");
        ++current;
        break;
      case u'C':
        current = C(current);
        break;
      case u'D':
        current = D(current);
        break;
      case u'F':
        current += At(current + 1) == u'F' ? 2 : 1;
        Add(u"F");
        break;
      case u'G':
        current = G(current);
        break;
      case u'H':
        // Kept only first or between vowels, and before a vowel.
        if ((current == 0 || IsVowel(current - 1)) && IsVowel(current + 1)) {
          Add(u"H");
          current += 2;
        } else {
          ++current;
        }
        break;
      case u'J':
        current = J(current);
        break;
      case u'K':
        current += At(current + 1) == u'K' ? 2 : 1;
        Add(u"K");
        break;
      case u'L':
        current = L(current);
        break;
      case u'M':
        if ((StringAt(current - 1, 3, {"UMB"}) &&
             (current + 1 == last_ || StringAt(current + 2, 2, {"ER"}))) ||
            At(current + 1) == u'M') {
          current += 2;
        } else {
          ++current;
        }
        Add(u"M");
        break;
      case u'N':
        current += At(current + 1) == u'N' ? 2 : 1;
        Add(u"N");
        break;
      case u'\u00D1':  // Ñ
        ++current;
        Add(u"N");
        break;
      case u'P':
        if (At(current + 1) == u'H') {
          Add(u"F");
          current += 2;
          break;
        }
        current += StringAt(current + 1, 1, {"P", "B"}) ? 2 : 1;
        Add(u"P");
        break;
      case u'Q':
        current += At(current + 1) == u'Q' ? 2 : 1;
        Add(u"K");
        break;
      case u'R':
        // French final -IER (Rogier) has no R in the primary code. The exception
        // for -MEIER/-MAIER is taken as any M four letters back (so -MPIER and
        // -MMIER keep their R), as the reference codes have it.
        if (!(current == last_ && !slavo_germanic_ && StringAt(current - 2, 2, {"IE"}) &&
              At(current - 4) != u'M')) {
          Add(u"R");
        }
        current += At(current + 1) == u'R' ? 2 : 1;
        break;
      case u'S':
        current = S(current);
        break;
      case u'T':
        current = T(current);
        break;
      case u'V':
        current += At(current + 1) == u'V' ? 2 : 1;
        Add(u"F");
        break;
      case u'W':
        current = W(current);
        break;
      case u'X':
        // French final -AUX, -OUX, -EAUX, -IAUX are silent.
        if (!(current == last_ &&
              (StringAt(current - 3, 3, {"IAU", "EAU"}) || StringAt(current - 2, 2, {"AU", "OU"})))) {
          Add(u"KS");
        }
        current += StringAt(current + 1, 1, {"C", "X"}) ? 2 : 1;
        break;
      case u'Z':
        if (At(current + 1) == u'H') {  // Chinese pinyin, Zhao
          Add(u"J");
          current += 2;
          break;
        }
        Add(u"S");
        current += At(current + 1) == u'Z' ? 2 : 1;
        break;
      default:
        ++current;
        break;
    }
  }
}

int Encoder::C(int current) {
  // Germanic -ACH- (Bacher, Macher), but not -ACHI-, -ACHE-.
  if (current > 1 && !IsVowel(current - 2) && StringAt(current - 1, 3, {"ACH"}) &&
      At(current + 2) != u'I' &&
      (At(current + 2) != u'E' || StringAt(current - 2, 6, {"BACHER", "MACHER"}))) {
    Add(u"K");
    return current + 2;
  }
  if (current == 0 && StringAt(current, 6, {"CAESAR"})) {
    Add(u"S");
    return current + 2;
  }
  if (StringAt(current, 4, {"CHIA"})) {  // Italian Chianti
    Add(u"K");
    return current + 2;
  }
  if (StringAt(current, 2, {"CH"})) {
    if (current > 0 && StringAt(current, 4, {"CHAE"})) {  // Michael
      Add(u"K");
      return current + 2;
    }
    // Greek roots: chemistry, chorus, but not chore.
    if (current == 0 &&
        (StringAt(current + 1, 5, {"HARAC", "HARIS"}) ||
         StringAt(current + 1, 3, {"HOR", "HYM", "HIA", "HEM"})) &&
        !StringAt(0, 5, {"CHORE"})) {
      Add(u"K");
      return current + 2;
    }
    // Germanic, Greek or otherwise CH for the KH sound.
    if (StringAt(0, 4, {"VAN ", "VON "}) || StringAt(0, 3, {"SCH"}) ||
        StringAt(current - 2, 6, {"ORCHES", "ARCHIT", "ORCHID"}) ||
        StringAt(current + 2, 1, {"T", "S"}) ||
        ((StringAt(current - 1, 1, {"A", "O", "U", "E"}) || current == 0) &&
         StringAt(current + 2, 1, {"L", "R", "N", "M", "B", "H", "F", "V", "W", " "}))) {
      Add(u"K");
    } else if (current > 0) {
      Add(StringAt(0, 2, {"MC"}) ? u"K" : u"X");  // McHugh
    } else {
      Add(u"X");
    }
    return current + 2;
  }
  if (StringAt(current, 2, {"CZ"}) && !StringAt(current - 2, 4, {"WICZ"})) {  // Czerny
    Add(u"S");
    return current + 2;
  }
  if (StringAt(current + 1, 3, {"CIA"})) {  // Focaccia
    Add(u"X");
    return current + 3;
  }
  // Double C, but not McClellan.
  if (StringAt(current, 2, {"CC"}) && !(current == 1 && At(0) == u'M')) {
    if (StringAt(current + 2, 1, {"I", "E", "H"}) && !StringAt(current + 2, 2, {"HU"})) {
      // Accident, accede, succeed; else Italian bacci, bertucci.
      if ((current == 1 && At(current - 1) == u'A') ||
          StringAt(current - 1, 5, {"UCCEE", "UCCES"})) {
        Add(u"KS");
      } else {
        Add(u"X");
      }
      return current + 3;
    }
    Add(u"K");  // Pierce's rule
    return current + 2;
  }
  if (StringAt(current, 2, {"CK", "CG", "CQ"})) {
    Add(u"K");
    return current + 2;
  }
  if (StringAt(current, 2, {"CI", "CE", "CY"})) {
    Add(u"S");
    return current + 2;
  }
  Add(u"K");
  // Mac Caffrey, Mac Gregor.
  if (StringAt(current + 1, 2, {" C", " Q", " G"})) return current + 3;
  // A second C reaches here only in Mc-C- (McCain), whose C codes again, as in
  // the reference codes.
  if (StringAt(current + 1, 1, {"K", "Q"})) return current + 2;
  return current + 1;
}

int Encoder::D(int current) {
  if (StringAt(current, 2, {"DG"})) {
    if (StringAt(current + 2, 1, {"I", "E", "Y"})) {  // edge
      Add(u"J");
      return current + 3;
    }
    Add(u"TK");  // Edgar
    return current + 2;
  }
  Add(u"T");
  return current + (StringAt(current, 2, {"DT", "DD"}) ? 2 : 1);
}

int Encoder::G(int current) {
  if (At(current + 1) == u'H') {
    if (current > 0 && !IsVowel(current - 1)) {
      Add(u"K");
      return current + 2;
    }
    if (current == 0) {  // Ghislane, Ghiradelli
      Add(At(current + 2) == u'I' ? u"J" : u"K");
      return current + 2;
    }
    // Parker's rule: hugh, bough, broughton.
    if ((current > 1 && StringAt(current - 2, 1, {"B", "H", "D"})) ||
        (current > 2 && StringAt(current - 3, 1, {"B", "H", "D"})) ||
        (current > 3 && StringAt(current - 4, 1, {"B", "H"}))) {
      return current + 2;
    }
    // Laugh, McLaughlin, cough, gough, rough, tough.
    if (current > 2 && At(current - 1) == u'U' &&
        StringAt(current - 3, 1, {"C", "G", "L", "R", "T"})) {
      Add(u"F");
    } else if (current > 0 && At(current - 1) != u'I') {
      Add(u"K");
    }
    return current + 2;
  }
  if (At(current + 1) == u'N') {
    if (current == 1 && IsVowel(0) && !slavo_germanic_) {
      Add(u"KN");
    } else if (!StringAt(current + 2, 2, {"EY"}) && At(current + 1) != u'Y' &&
               !slavo_germanic_) {
      Add(u"N");  // not Cagney
    } else {
      Add(u"KN");
    }
    return current + 2;
  }
  if (StringAt(current + 1, 2, {"LI"}) && !slavo_germanic_) {  // Tagliaro
    Add(u"KL");
    return current + 2;
  }
  // -GES-, -GEP-, -GEL-, -GIE- at the beginning.
  if (current == 0 &&
      (At(current + 1) == u'Y' ||
       StringAt(current + 1, 2,
                {"ES", "EP", "EB", "EL", "EY", "IB", "IL", "IN", "IE", "EI", "ER"}))) {
    Add(u"K");
    return current + 2;
  }
  // -GER-, -GY-; not -RGY- (clergy). -OGY- (biology) is hard here, as in the
  // reference codes.
  if ((StringAt(current + 1, 2, {"ER"}) || At(current + 1) == u'Y') &&
      !StringAt(0, 6, {"DANGER", "RANGER", "MANGER"}) && !StringAt(current - 1, 1, {"E", "I"}) &&
      !StringAt(current - 1, 3, {"RGY"})) {
    Add(u"K");
    return current + 2;
  }
  // Italian biaggi.
  if (StringAt(current + 1, 1, {"E", "I", "Y"}) || StringAt(current - 1, 4, {"AGGI", "OGGI"})) {
    if (StringAt(0, 4, {"VAN ", "VON "}) || StringAt(0, 3, {"SCH"}) ||
        StringAt(current + 1, 2, {"ET"})) {
      Add(u"K");  // obviously Germanic
    } else {
      Add(u"J");  // soft, always so before a French ending -IER
    }
    return current + 2;
  }
  Add(u"K");
  return current + (At(current + 1) == u'G' ? 2 : 1);
}

int Encoder::J(int current) {
  // Spanish Jose, San Jacinto.
  if (StringAt(current, 4, {"JOSE"}) || StringAt(0, 4, {"SAN "})) {
    if ((current == 0 && At(current + 4) == u' ') || StringAt(0, 4, {"SAN "})) {
      Add(u"H");
    } else {
      Add(u"J");
    }
    return current + 1;
  }
  if (current == 0) {
    Add(u"J");  // Yankelovich / Jankelowicz
  } else if (IsVowel(current - 1) && !slavo_germanic_ &&
             (At(current + 1) == u'A' || At(current + 1) == u'O')) {
    Add(u"J");  // Spanish bajador
  } else if (current == last_) {
    Add(u"J");
  } else if (!StringAt(current + 1, 1, {"L", "T", "K", "S", "N", "M", "B", "Z"}) &&
             !StringAt(current - 1, 1, {"S", "K", "L"})) {
    Add(u"J");
  }
  return current + (At(current + 1) == u'J' ? 2 : 1);
}

int Encoder::L(int current) {
  if (At(current + 1) == u'L') {
    // Spanish cabrillo, gallegos: the primary code keeps one L either way.
    Add(u"L");
    return current + 2;
  }
  Add(u"L");
  return current + 1;
}

int Encoder::S(int current) {
  if (StringAt(current - 1, 3, {"ISL", "YSL"})) return current + 1;  // island, isle, carlisle
  if (current == 0 && StringAt(current, 5, {"SUGAR"})) {
    Add(u"X");
    return current + 1;
  }
  if (StringAt(current, 2, {"SH"})) {
    // Germanic -SHEIM, -SHOEK, -SHOLM, -SHOLZ.
    Add(StringAt(current + 1, 4, {"HEIM", "HOEK", "HOLM", "HOLZ"}) ? u"S" : u"X");
    return current + 2;
  }
  // Italian and Armenian -SIO-, -SIA-, -SIAN.
  if (StringAt(current, 3, {"SIO", "SIA"}) || StringAt(current, 4, {"SIAN"})) {
    Add(u"S");
    return current + 3;
  }
  // Smith to match Schmidt, Snider to match Schneider; Slavic -SZ-.
  if ((current == 0 && StringAt(current + 1, 1, {"M", "N", "L", "W"})) ||
      StringAt(current + 1, 1, {"Z"})) {
    Add(u"S");
    return current + (StringAt(current + 1, 1, {"Z"}) ? 2 : 1);
  }
  if (StringAt(current, 2, {"SC"})) {
    if (At(current + 2) == u'H') {  // Schlesinger's rule
      // Dutch origin: school, schooner; schermerhorn, schenker.
      if (StringAt(current + 3, 2, {"OO", "ER", "EN", "UY", "ED", "EM"})) {
        Add(StringAt(current + 3, 2, {"ER", "EN"}) ? u"X" : u"SK");
      } else {
        Add(u"X");
      }
      return current + 3;
    }
    Add(StringAt(current + 2, 1, {"I", "E", "Y"}) ? u"S" : u"SK");
    return current + 3;
  }
  // French final -AIS, -OIS (Resnais, Artois) keep no S in the primary code.
  if (!(current == last_ && StringAt(current - 2, 2, {"AI", "OI"}))) Add(u"S");
  return current + (StringAt(current + 1, 1, {"S", "Z"}) ? 2 : 1);
}

int Encoder::T(int current) {
  if (StringAt(current, 4, {"TION"}) || StringAt(current, 3, {"TIA", "TCH"})) {
    Add(u"X");
    return current + 3;
  }
  if (StringAt(current, 2, {"TH"}) || StringAt(current, 3, {"TTH"})) {
    // Thomas, Thames, or Germanic.
    if (StringAt(current + 2, 2, {"OM", "AM"}) || StringAt(0, 4, {"VAN ", "VON "}) ||
        StringAt(0, 3, {"SCH"})) {
      Add(u"T");
    } else {
      Add(u"0");
    }
    return current + 2;
  }
  Add(u"T");
  return current + (StringAt(current + 1, 1, {"T", "D"}) ? 2 : 1);
}

int Encoder::W(int current) {
  if (StringAt(current, 2, {"WR"})) {
    Add(u"R");
    return current + 2;
  }
  if (current == 0 && (IsVowel(current + 1) || StringAt(current, 2, {"WH"}))) {
    Add(u"A");  // Wasserman and Vasserman, Uomo and Womo
  }
  // Arnow to match Arnoff: silent in the primary code.
  if ((current == last_ && IsVowel(current - 1)) ||
      StringAt(current - 1, 5, {"EWSKI", "EWSKY", "OWSKI", "OWSKY"}) || StringAt(0, 3, {"SCH"})) {
    return current + 1;
  }
  if (StringAt(current, 4, {"WICZ", "WITZ"})) {  // Polish Filipowicz
    Add(u"TS");
    return current + 4;
  }
  return current + 1;
}

}  // namespace

void DoubleMetaphonePrimary(std::u16string_view word, std::u16string& out) {
  out.clear();
  Encoder(word, out).Run();
}

}  // namespace qm::text
