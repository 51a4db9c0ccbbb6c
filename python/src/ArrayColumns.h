#pragma once
// Numpy arrays that take over a std::vector's storage, so that columns filled in C++ (with the
// interpreter lock released) reach Python without a copy and without a Python object per frame.

#include <cstddef>
#include <cstdint>
#include <vector>

#include <pybind11/numpy.h>
#include <pybind11/pybind11.h>

namespace TolkaTouch::Python {

namespace py = pybind11;

// A one-dimensional array of the values (rows == values.size()), or rows x columns.
template <typename T>
py::array arrayFrom(std::vector<T>&& values, size_t columns = 0) {
    auto* owned = new std::vector<T>(std::move(values));
    py::capsule owner(owned, [](void* p) { delete static_cast<std::vector<T>*>(p); });
    const auto size = static_cast<py::ssize_t>(owned->size());
    const auto width = static_cast<py::ssize_t>(columns);
    std::vector<py::ssize_t> shape{size};
    if (width != 0) shape = {size / width, width};
    return py::array_t<T>(shape, owned->data(), owner);
}

// Flags kept one byte each (std::vector<bool> packs bits) as a numpy bool array.
py::array boolArrayFrom(std::vector<uint8_t>&& flags, size_t columns = 0);

}  // namespace TolkaTouch::Python
