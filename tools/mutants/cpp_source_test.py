#!/usr/bin/env python3
"""The reader finds functions, blocks and statements, and is not misled by what looks like them."""

import unittest

from cpp_source import Source
from cpp_tokens import Unreadable, tokens_of


def words(text):
    return [token.text for token in tokens_of(text)]


def kinds(function):
    return [statement.kind for statement in function.body.statements]


def only(text):
    functions = Source(text).functions
    assert len(functions) == 1, functions
    return functions[0]


def inside(text):
    """The function with these statements."""
    return only(f"void F() {{ {text} }}")


class TheTokens(unittest.TestCase):
    def test_comments_and_directives_are_none(self):
        self.assertEqual(words('#include "a.h"\n#define X \\\n  1\nint a; // b\n/* c\n d */ int e;'),
                         ["int", "a", ";", "int", "e", ";"])

    def test_a_text_is_one_whatever_stands_in_it(self):
        self.assertEqual(words(r'f("a // \" b", R"x(")" /*)x", u8"c", \'"\');'.replace("\\'", "'")),
                         ["f", "(", r'"a // \" b"', ",", 'R"x(")" /*)x"', ",", 'u8"c"', ",", "'\"'", ")", ";"])

    def test_numbers_are_whole(self):
        self.assertEqual(words("0x2BACFFFF 1'000u 1.5e-3 .5"), ["0x2BACFFFF", "1'000u", "1.5e-3", ".5"])

    def test_closing_angles_are_two(self):
        self.assertEqual(words("Ref<List<A>> a"), ["Ref", "<", "List", "<", "A", ">", ">", "a"])

    def test_an_open_bracket_is_an_error(self):
        for text in ("void F() { (; }", "int a[3;", "}"):
            with self.assertRaises(Unreadable):
                Source(text)


class Functions(unittest.TestCase):
    def names(self, text):
        return [function.name for function in Source(text).functions]

    def test_are_found_in_namespaces_classes_and_templates(self):
        self.assertEqual(self.names("namespace A::B { void F() {} }\n"
                                    "class C final : public D<int> {\n public:\n  int G() const { return 1; }\n};\n"
                                    "template <class T, class... U>\nvoid H(T t) {}\n"
                                    'extern "C" int I() { return 0; }\n'
                                    '[[noreturn]] void J() {}'), ["F", "G", "H", "I", "J"])

    def test_are_named_with_their_class(self):
        self.assertEqual(self.names("void A::B::F() const noexcept {} A::~A() {} bool operator==(A a, A b) {}"),
                         ["A::B::F", "A::~A", "operator=="])

    def test_of_construction_begin_with_what_they_set(self):
        source = Source('C::C(int a) : D("d"), _a{a}, _b(F([] { return 1; })) { G(); }')
        function = source.functions[0]
        self.assertEqual(source.at(function.first), ":")
        self.assertEqual(source.words(function.body.first, function.body.last), "{ G(); }")

    def test_tell_their_type(self):
        types = [f.type for f in Source("static void F() {} C::C() {} Ref<A> G() {} const char* H() {}").functions]
        self.assertEqual(types, ["void", "", "Ref < A >", "const char *"])

    def test_are_none_where_a_variable_is_given_values(self):
        source = Source("constexpr Row rows[] = {{&F, 1}, {&G, 2}}; std::string a{1}; int b = [] { return 1; }();")
        self.assertEqual(source.functions, [])
        self.assertEqual([value.name for value in source.values], ["rows", "a", "b"])

    def test_without_body_are_declarations(self):
        values = Source("virtual void F(int a = 1) = 0; A(const A&) = delete; A& operator=(A); int b;").values
        self.assertEqual([(value.name, value.is_function) for value in values],
                         [("F", True), ("A", True), ("operator=", True), ("b", False)])

    def test_using_enumerations_and_friends_are_passed_over(self):
        source = Source("using A = B<1>; enum class E : int { A = 1 }; static_assert(sizeof(A) == 4); friend class F;")
        self.assertEqual((source.functions, source.values), ([], []))


class Statements(unittest.TestCase):
    def test_are_told_apart(self):
        function = inside("int a = 1; a = 2; f(a); if (a) { b(); } for (;;) { } return;")
        self.assertEqual(kinds(function), ["declaration", "expression", "expression", "if", "for", "return"])

    def test_declare_or_do_not(self):
        for text in ("const auto a = b;", "auto* const a = b;", "A::B<C, D> a(1);", "std::vector<A*> a;",
                     "static const A& a = b;", "constexpr int a = 1;", "const A a{b};", "using B::C;"):
            self.assertEqual(kinds(inside(text)), ["declaration"], text)
        for text in ("a = b;", "a->b(c);", "A::b(c);", "f<A>(b);", "++*a;", "*a = b;", "delete a;", "a[1] = 2;",
                     "(a.*b)(c);"):
            self.assertEqual(kinds(inside(text)), ["expression"], text)

    def test_the_condition_is_what_is_tested(self):
        source = Source("void F() { if (int a = b(); a > 1) { } for (int i = 0; i < 3; ++i) { } for (A a : b) { } }")
        found = [statement.condition and source.words(*statement.condition)
                 for statement in source.functions[0].body.statements]
        self.assertEqual(found, ["a > 1", "i < 3", None])

    def test_every_branch_is_reached(self):
        function = inside("if (a) { b(); } else if (c) { d(); } else { e(); }")
        self.assertEqual(kinds(function), ["if"])
        self.assertEqual([block.kind for block in function.blocks()], ["function", "then", "then", "else"])

    def test_every_handler_is_reached(self):
        function = inside("try { a(); } catch (const A& b) { c(); } catch (...) { throw; } d();")
        self.assertEqual(kinds(function), ["try", "expression"])
        self.assertEqual([block.kind for block in function.body.statements[0].blocks], ["try", "catch", "catch"])

    def test_labels_stand_alone(self):
        self.assertEqual([s.kind for s in inside("switch (a) { case A::B: return; default: break; }").statements()],
                         ["switch", "label", "return", "label", "break"])

    def test_lambdas_have_bodies_and_lists_have_none(self):
        for text in ("f([&] { a(); });", "f([](int b) { a(); });", "f([b]() mutable { a(); });",
                     "const auto f = [] (A b) -> Ref<C> { a(); };", "if (any(b, [](int c) { a(); })) { }"):
            self.assertIn("lambda", [block.kind for block in inside(text).blocks()], text)
        for text in ("f({a, b});", "A b = {.c = 1};", "a[b] = {1};", "f(A{1}, B<C>{2});", "return {};"):
            self.assertEqual([block.kind for block in inside(text).blocks()], ["function"], text)


if __name__ == "__main__":
    unittest.main()
