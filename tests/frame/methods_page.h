#pragma once
#include <string>

namespace zor {

/// The vocabulary of the two classes as Markdown, printed from the tables that a host gets.
std::string MethodsPage();

}
