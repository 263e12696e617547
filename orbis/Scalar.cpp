#include "orbis/Scalar.h"

#include <array>
#include <charconv>
#include <chrono>

#include "tessa/text/Base64.h"

namespace Orbis {
namespace {

// Calls `action` with the value, typed.
template <class Void, class Action>
auto WithTyped(FieldKind kind, Void* value, Action action) {
  constexpr bool isConst = std::is_const_v<Void>;
  const auto typed = [&]<class T>(T*) -> decltype(auto) {
    using Pointer = std::conditional_t<isConst, const T*, T*>;
    return action(*static_cast<Pointer>(value));
  };
  switch (kind) {
    case FieldKind::Boolean:
      return typed(static_cast<bool*>(nullptr));
    case FieldKind::Int:
      return typed(static_cast<std::int32_t*>(nullptr));
    case FieldKind::Long:
      return typed(static_cast<std::int64_t*>(nullptr));
    case FieldKind::DateTime:
      return typed(static_cast<DateTime*>(nullptr));
    case FieldKind::Base64:
      return typed(static_cast<Bytes*>(nullptr));
    default:
      return typed(static_cast<std::string*>(nullptr));
  }
}

void AppendPadded(std::string& out, long long number, std::size_t width) {
  const std::string digits = std::to_string(number);
  out.append(digits.size() < width ? width - digits.size() : 0, '0').append(digits);
}

constexpr std::int64_t microsecondsPerSecond = 1'000'000;
constexpr std::int64_t secondsPerDay = 86'400;
constexpr std::int64_t firstSecond = -62'135'596'800;  // 0001-01-01T00:00:00Z
constexpr std::int64_t lastSecond = 253'402'300'799;   // 9999-12-31T23:59:59Z

void Append(const bool& value, std::string& out) {
  out += value ? "true" : "false";
}
void Append(const std::int32_t& value, std::string& out) {
  out += std::to_string(value);
}
void Append(const std::int64_t& value, std::string& out) {
  out += std::to_string(value);
}
void Append(const std::string& value, std::string& out) {
  out += value;
}
void Append(const Bytes& value, std::string& out) {
  Tessa::AppendBase64(value, out);
}

void Append(const DateTime& value, std::string& out) {
  using namespace std::chrono;
  const sys_time<microseconds> moment{microseconds(value.microseconds)};
  const auto day = floor<days>(moment);
  const year_month_day date(day);
  const hh_mm_ss time(moment - day);
  AppendPadded(out, static_cast<int>(date.year()), 4);
  AppendPadded(out += '-', static_cast<unsigned>(date.month()), 2);
  AppendPadded(out += '-', static_cast<unsigned>(date.day()), 2);
  AppendPadded(out += 'T', time.hours().count(), 2);
  AppendPadded(out += ':', time.minutes().count(), 2);
  AppendPadded(out += ':', time.seconds().count(), 2);
  if (const auto fraction = time.subseconds().count(); fraction != 0) {
    AppendPadded(out += '.', fraction, 6);
    out.erase(out.find_last_not_of('0') + 1);
  }
  out += 'Z';
}

bool Parse(std::string_view text, bool& value) {
  const bool yes = text == "true" || text == "1";
  if (!yes && text != "false" && text != "0") {
    return false;
  }
  value = yes;
  return true;
}

template <class T>
bool ParseInteger(std::string_view text, T& value) {
  if (text.size() > 1 && text[0] == '+' && text[1] != '-') {
    text.remove_prefix(1);  // XML Schema allows the sign, from_chars does not
  }
  T number = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
  if (text.empty() || error != std::errc() || end != text.data() + text.size()) {
    return false;
  }
  value = number;
  return true;
}

bool Parse(std::string_view text, std::int32_t& value) {
  return ParseInteger(text, value);
}
bool Parse(std::string_view text, std::int64_t& value) {
  return ParseInteger(text, value);
}

bool Parse(std::string_view text, std::string& value) {
  value = text;
  return true;
}

bool Parse(std::string_view text, Bytes& value) {
  return Tessa::ParseBase64(text, value);
}

// Reads a date piece by piece, from the front.
class DateReader {
 public:
  explicit DateReader(std::string_view text) : _rest(text) {}

  // Exactly `width` digits.
  int Digits(std::size_t width) {
    int number = 0;
    for (std::size_t i = 0; i < width; ++i) {
      if (_rest.empty() || _rest[0] < '0' || _rest[0] > '9') {
        _sound = false;
        return 0;
      }
      number = number * 10 + (_rest[0] - '0');
      _rest.remove_prefix(1);
    }
    return number;
  }

  bool Skip(char wanted) {
    if (_rest.empty() || _rest[0] != wanted) {
      return false;
    }
    _rest.remove_prefix(1);
    return true;
  }

  void Require(char wanted) { _sound = Skip(wanted) && _sound; }

  // Microseconds behind the point: 1 to 6 digits.
  int Fraction() {
    std::size_t width = 0;
    while (width < _rest.size() && _rest[width] >= '0' && _rest[width] <= '9') {
      ++width;
    }
    if (width == 0 || width > 6) {
      _sound = false;
      return 0;
    }
    int number = Digits(width);
    for (; width < 6; ++width) {
      number *= 10;
    }
    return number;
  }

  // Seconds that the zone is ahead of UTC.
  int Zone() {
    if (Skip('Z')) {
      return 0;
    }
    const bool ahead = Skip('+');
    if (!ahead) {
      Require('-');
    }
    const int hours = Digits(2);
    Require(':');
    const int minutes = Digits(2);
    _sound = _sound && (hours < 14 || (hours == 14 && minutes == 0)) && minutes < 60;
    return (ahead ? 60 : -60) * (60 * hours + minutes);
  }

  bool IsSoundAndDone() const { return _sound && _rest.empty(); }

 private:
  std::string_view _rest;
  bool _sound = true;
};

bool Parse(std::string_view text, DateTime& value) {
  using namespace std::chrono;
  DateReader reader(text);
  const int y = reader.Digits(4);
  reader.Require('-');
  const int m = reader.Digits(2);
  reader.Require('-');
  const int d = reader.Digits(2);
  reader.Require('T');
  const int hour = reader.Digits(2);
  reader.Require(':');
  const int minute = reader.Digits(2);
  reader.Require(':');
  const int second = reader.Digits(2);
  const int fraction = reader.Skip('.') ? reader.Fraction() : 0;
  const int zone = reader.Zone();
  const year_month_day date{year(y), month(static_cast<unsigned>(m)), day(static_cast<unsigned>(d))};
  if (!reader.IsSoundAndDone() || y == 0 || !date.ok() || hour > 23 || minute > 59 || second > 59) {
    return false;
  }
  const std::int64_t days = sys_days(date).time_since_epoch().count();
  const std::int64_t seconds = days * secondsPerDay + hour * 3600 + minute * 60 + second - zone;
  // A zone may carry the moment over the edge of what can be written.
  if (seconds < firstSecond || seconds > lastSecond) {
    return false;
  }
  value.microseconds = seconds * microsecondsPerSecond + fraction;
  return true;
}

}  // namespace

void AppendScalar(FieldKind kind, const void* value, std::string& out) {
  WithTyped(kind, value, [&](const auto& typed) { Append(typed, out); });
}

bool ParseScalar(FieldKind kind, std::string_view text, void* value) {
  return WithTyped(kind, value, [&](auto& typed) { return Parse(text, typed); });
}

bool EqualScalar(FieldKind kind, const void* left, const void* right) {
  return WithTyped(kind, left, [&](const auto& typed) {
    using T = std::remove_cvref_t<decltype(typed)>;
    return typed == *static_cast<const T*>(right);
  });
}

const void* BoxedValue(const Any& boxed) {
  return BoxedValue(const_cast<Any&>(boxed));
}

void* BoxedValue(Any& boxed) {
  switch (boxed.GetType().simple) {
    case FieldKind::Boolean:
      return &static_cast<Boxed<bool>&>(boxed).Value();
    case FieldKind::Int:
      return &static_cast<Boxed<std::int32_t>&>(boxed).Value();
    case FieldKind::Long:
      return &static_cast<Boxed<std::int64_t>&>(boxed).Value();
    case FieldKind::DateTime:
      return &static_cast<Boxed<DateTime>&>(boxed).Value();
    case FieldKind::Base64:
      return &static_cast<Binary&>(boxed).Value();
    default:
      return &static_cast<Boxed<std::string>&>(boxed).Value();
  }
}

Ref<Any> CloneBoxed(const Any& boxed) {
  return WithTyped(boxed.GetType().simple, BoxedValue(boxed), [](const auto& typed) -> Ref<Any> {
    return new Boxed<std::remove_cvref_t<decltype(typed)>>(typed);
  });
}

std::string_view DescribeKind(FieldKind kind) {
  switch (kind) {
    case FieldKind::Boolean:
      return "a boolean (true or false)";
    case FieldKind::Int:
      return "an integer of 32 bits";
    case FieldKind::Long:
      return "an integer of 64 bits";
    case FieldKind::DateTime:
      return "a date with a zone, such as 2020-01-31T12:00:00Z";
    case FieldKind::Base64:
      return "base64 data";
    default:
      return "a text";
  }
}

}  // namespace Orbis
