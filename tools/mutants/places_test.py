#!/usr/bin/env python3
"""What is changed, and what is left alone because nothing would show."""

import unittest

from places import changed, places_of


def results(kind, code, file="a.cpp"):
    """What comes of the code by the changes of this kind."""
    return [changed(code, place.edits) for place in places_of(file, code) if place.kind == kind]


def inside(kind, text, type_="void"):
    """The same for these statements of a function, of which alone the result tells."""
    head = f"{type_} F() {{ "
    found = results(kind, f"{head}{text} }}")
    assert all(result.startswith(head) for result in found), found
    return [" ".join(result.removeprefix(head).removesuffix("}").split()) for result in found]


class Conditions(unittest.TestCase):
    def test_are_negated(self):
        for before, after in (("a", "!(a)"), ("!a", "a"), ("a == b", "a != b"), ("a < b", "a >= b"),
                              ("a && b", "!(a && b)"), ("f(a < b)", "!(f(a < b))"),
                              ("const A* a = b", "const A* a = b; !a")):
            self.assertEqual(inside("condition negated", f"if ({before}) {{ }}"), [f"if ({after}) {{ }}"])

    def test_of_loops_are_too_but_not_made_endless(self):
        code = "while (a) { b(); }"
        self.assertEqual(inside("condition negated", code), ["while (!(a)) { b(); }"])
        self.assertEqual(inside("condition always true", code), [])
        self.assertEqual(inside("condition negated", "for (A a : b) { }"), [])

    def test_hold_always_and_never(self):
        code = "if (a) { } else if (b) { }"
        self.assertEqual(inside("condition never true", code),
                         ["if (false) { } else if (b) { }", "if (a) { } else if (false) { }"])
        self.assertEqual(len(inside("condition always true", code)), 2)

    def test_lose_either_operand(self):
        self.assertEqual(sorted(inside("operand dropped", "c = a(x, y) && b;")), ["c = a(x, y);", "c = b;"])
        self.assertEqual(sorted(inside("operand dropped", "f(!a || (b && c));")),
                         ["f(!a || (b));", "f(!a || (c));", "f(!a);", "f((b && c));"])

    def test_take_the_other_logic(self):
        self.assertEqual(inside("logic changed", "c = a && b || d;"), ["c = a || b || d;", "c = a && b && d;"])
        self.assertEqual(inside("logic changed", "A&& a = b;"), [])


class Assertions(unittest.TestCase):
    def test_are_left_as_they_are_and_where_they_are(self):
        code = "void F() { assert(a < 7 && b); c(); assert(d == 1); }"
        self.assertEqual([place.kind for place in places_of("a.cpp", code)],
                         ["returns at once", "statement dropped"])
        self.assertEqual(results("statement dropped", code), ["void F() { assert(a < 7 && b);  assert(d == 1); }"])


class Expressions(unittest.TestCase):
    def test_constants_get_their_neighbours(self):
        self.assertEqual(inside("constant changed", "f(7U);"), ["f(6U);", "f(8U);"])
        self.assertEqual(inside("constant changed", "f(0);"), ["f(1);"])
        self.assertEqual(results("constant changed", "virtual void F() = 0;"), [])

    def test_texts_get_longer(self):
        self.assertEqual(inside("text changed", 'f("a", "");'), ['f("a#", "");', 'f("a", "#");'])
        self.assertEqual(results("text changed", '#include "a.h"\nstatic_assert(a, "b");'), [])

    def test_comparisons_are_not_brackets_of_templates(self):
        self.assertEqual(sorted(inside("comparison changed", "a = f<B>(c < d);")),
                         ["a = f<B>(c <= d);", "a = f<B>(c >= d);"])

    def test_arms_of_a_choice_change_places(self):
        self.assertEqual(inside("arms of a choice swapped", "f(a ? b(c, d) : E::e, g);"), ["f(a ? E::e : b(c, d), g);"])

    def test_arguments_change_places(self):
        self.assertEqual(inside("arguments swapped", "f(a, g(b), b);"), ["f(g(b), a, b);", "f(a, b, g(b));"])

    def test_arguments_that_are_alike_or_cannot_do_not(self):
        for code in ("f(a, a);", "f(LogLevel::Info, a);", "f({.a = 1, .b = 2});", "for (;;) { }"):
            self.assertEqual(inside("arguments swapped", code), [], code)
        self.assertEqual(results("arguments swapped", "void F(int a, int b = 1);"), [])

    def test_rows_change_places_or_go(self):
        code = "A a[] = {{1, b}, {2, c}};"
        self.assertIn("A a[] = {{2, c}, {1, b}};", results("rows swapped", code))
        self.assertEqual(results("row dropped", code), ["A a[] = {{2, c}};"])

    def test_levels_and_truths_and_kinds_become_others(self):
        self.assertEqual(inside("log level changed", "f(LogLevel::Warning);"), ["f(LogLevel::Info);"])
        self.assertEqual(inside("name changed", "f(true);"), ["f(false);"])
        self.assertEqual(inside("name changed", "f(A::B::c); f(A::B::d);"),
                         ["f(A::B::d); f(A::B::d);", "f(A::B::c); f(A::B::c);"])
        self.assertEqual(inside("name changed", "A::b x; A::c y; A::d();"), [])


class Steps(unittest.TestCase):
    def test_are_dropped(self):
        self.assertEqual(inside("statement dropped", "if (b) { c(); return; } a();"),
                         ["if (b) { return; } a();", "if (b) { c(); } a();", "if (b) { c(); return; }"])

    def test_that_alone_hang_on_a_condition_are_not_for_it_has_its_own_change(self):
        self.assertEqual(inside("statement dropped", "if (a) { b(); } c();"), ["if (a) { b(); }"])
        self.assertEqual(inside("statement dropped", "if (a) { b(); } else { c(); } d();"),
                         ["if (a) { } else { c(); } d();", "if (a) { b(); } else { } d();",
                          "if (a) { b(); } else { c(); }"])

    def test_whose_names_are_used_or_whose_answer_is_needed_are_not(self):
        self.assertEqual(inside("statement dropped", "A a(b); return a;", "int"), [])
        self.assertEqual(inside("statement dropped", "const Guard guard(a);"), [""])
        self.assertEqual(inside("statement dropped", "try { f(); return a; } catch (B) { return c; }", "int"),
                         ["try { return a; } catch (B) { return c; }"])

    def test_that_only_a_clock_sees_are_not(self):
        for code in ("a.reserve(b);", "a->Reserve(b->Size());"):
            self.assertEqual(inside("statement dropped", code), [], code)

    def test_change_places(self):
        self.assertEqual(inside("statements swapped", "a(); b();"), ["b(); a();"])
        self.assertEqual(inside("statements swapped", "const A a = b(); c();"), ["c(); const A a = b();"])

    def test_that_depend_or_whose_order_does_not_show_do_not(self):
        for code in ("const A a = b(); c(a);", "a(); return;", "A a; b();", "const auto a = MakeRef<A>(); b();",
                     "a->SetB(1); a->SetC(2);", "a.push_back(c); b.push_back(!d[c].e);",
                     "a.b.push_back({c}); a.d.emplace_back(c.size());", "a = b; c = d;", "a->SetB(1); c->Append(a);",
                     'LogInternal("a"); b = MakeRef<C>();', 'LogInternal("b"); b = c.GetD();'):
            self.assertEqual(inside("statements swapped", code), [], code)
        for code in ("a->SetB(f(1)); d->SetC(2);", "a = b; c = a;", "a = b; a = c;",
                     "a.push_back(b); a.push_back(c);", "a.push_back(c); b.push_back(a);",
                     "a.push_back(f()); b.push_back(g());", "LogInternal(a); b = f();", "LogInternal(b); b = a;"):
            self.assertEqual(len(inside("statements swapped", code)), 1, code)

    def test_go_over_the_edge_of_a_lock(self):
        code = "a(); { const Guard g(m); b(); c(); } d();"
        self.assertEqual(inside("moved in", code),
                         ["{ const Guard g(m); a(); b(); c(); } d();", "a(); { const Guard g(m); b(); c(); d(); }"])
        self.assertEqual(inside("moved out behind", code),
                         ["a(); { const Guard g(m); b(); } c(); d();"])
        self.assertEqual(inside("moved out before", code),
                         ["a(); const Guard g(m); { b(); c(); } d();"])


class WholeFunctions(unittest.TestCase):
    def test_return_at_once(self):
        self.assertEqual(inside("returns at once", "a();"), ["return; a();"])
        self.assertEqual(inside("returns at once", "a(); return b;", "int"), ["return {}; a(); return b;"])

    def test_answer_otherwise(self):
        self.assertEqual(inside("answer changed", "return a;", "bool"), ["return false;", "return true;"])
        self.assertEqual(inside("answer emptied", "return a;", "int"), ["return {};"])

    def test_loop_once(self):
        self.assertEqual(inside("loop ends after one round", "for (;;) { a(); }"), ["for (;;) { a(); break; }"])

    def test_let_exceptions_through_or_swallow_more(self):
        code = "try { a(); } catch (const A& b) { c(); }"
        self.assertEqual(inside("exception let through", code), ["try { a(); } catch (const A& b) { throw; c(); }"])
        self.assertEqual(inside("other exceptions swallowed", code), [f"{code} catch (...) {{}}"])
        self.assertEqual(inside("other exceptions swallowed", "try { a(); } catch (...) { }"), [])

    def test_leave_a_member_alone(self):
        self.assertEqual(results("initializer dropped", "A::A() : _b(1), _c{2} {}"),
                         ["A::A() : _c{2} {}", "A::A() : _b(1) {}"])


class Definitions(unittest.TestCase):
    def test_change_places_but_not_in_a_header(self):
        code = "const A a = f();\nconst A b = g();"
        self.assertEqual(results("definitions swapped", code), ["const A b = g();\nconst A a = f();"])
        self.assertEqual(results("definitions swapped", code, "a.h"), [])

    def test_of_a_class_stay(self):
        self.assertEqual(results("definitions swapped", "namespace A { struct B { C c; D d; }; }"), [])


class Places(unittest.TestCase):
    def test_are_told_by_their_lines_without_their_blanks(self):
        place, = [p for p in places_of("a.cpp", 'void A::F() {\n  g(1,\n    "b");\n}') if p.kind == "text changed"]
        self.assertEqual((place.function, place.before, place.after, place.line), ("A::F", '"b");', '"b#");', 3))

    def test_that_come_to_the_same_are_one(self):
        kinds = [place.kind for place in places_of("a.cpp", "void F() { if (!a) { } }")]
        self.assertEqual(kinds.count("condition negated") + kinds.count("negation dropped"), 1)

    def test_of_many_lines_leave_out_the_middle(self):
        code = "void F() { " + "a(); " * 100 + "\n}"
        self.assertTrue(all(len(place.before) < 300 for place in places_of("a.cpp", code)))


if __name__ == "__main__":
    unittest.main()
