#include "ArrayColumns.h"

namespace TolkaTouch::Python {

py::array boolArrayFrom(std::vector<uint8_t>&& flags, size_t columns) {
    auto* owned = new std::vector<uint8_t>(std::move(flags));
    py::capsule owner(owned, [](void* p) { delete static_cast<std::vector<uint8_t>*>(p); });
    std::vector<py::ssize_t> shape{static_cast<py::ssize_t>(owned->size())};
    if (columns != 0) shape = {static_cast<py::ssize_t>(owned->size() / columns), static_cast<py::ssize_t>(columns)};
    return py::array(py::dtype("bool"), shape, owned->data(), owner);
}

}  // namespace TolkaTouch::Python
