// Objects for tests of the texts, made from what is known of their types: one of each type with known
// values, and any number of random ones.
//
// Threads: each object of these classes belongs to one thread.
#pragma once

#include <cstdint>
#include <random>
#include <string>
#include <vector>

#include "orbis/Any.h"
#include "orbis/TypeDescriptor.h"

namespace Codec {

using Orbis::Any;
using Orbis::Ref;
using Orbis::TypeDescriptor;

// Every registered type that has objects of its own.
std::vector<const TypeDescriptor*> ConcreteTypes();

// The names of all registered types, as parameters of tests.
std::vector<std::string> TypeNames();

// An object with every field set to a value that tells the field: texts are the field's name, numbers
// small, lists hold two elements. Objects inside have only what a new object has. Of an abstract type: a
// list with one object of each kind that has objects.
Ref<Any> MakeSample(const TypeDescriptor& type);

// What random texts may hold.
enum class Texts {
  Clean,  // whatever XML can hold: markup, quotes, line ends, blanks, all planes of Unicode
  Dirty,  // control characters, NUL, broken UTF-8 and non-characters too
};

// Makes random objects; the same seed makes the same ones.
class RandomObjects {
 public:
  RandomObjects(std::uint64_t seed, Texts texts) : _random(seed), _texts(texts) {}

  // Of the type itself, or of any of its kinds when it is abstract.
  Ref<Any> Make(const TypeDescriptor& type);
  std::string MakeText();

 private:
  Ref<Any> MakeObject(const TypeDescriptor& type);
  void FillField(const Orbis::FieldDescriptor& field, Orbis::DataObject& object);
  Ref<Any> MakeKindOf(const TypeDescriptor& declared);
  Ref<Any> MakeList(const TypeDescriptor& type);
  Ref<Any> MakeTextList();
  Ref<Any> MakeAnyValue();
  void FillScalar(Orbis::FieldKind kind, void* value);

  std::size_t Below(std::size_t bound) { return static_cast<std::size_t>(_random() % bound); }
  bool OneIn(std::size_t times) { return Below(times) == 0; }
  template <class T>
  T AnyNumber();

  std::mt19937_64 _random;
  Texts _texts;
  int _depth = 0;
};

}  // namespace Codec
