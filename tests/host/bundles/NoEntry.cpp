// A library that loads well and registers no class.
namespace {
[[maybe_unused]] const int kNothing = 0;
}
