#pragma once
// Points and rectangles of the UI. A point carries a position or a size; a
// rectangle is left, top, right, bottom with y growing downwards.

#include <ostream>

namespace tolmoui {

template <class T>
struct PointT {
    T x{};
    T y{};
    T h() const { return x; }
    T v() const { return y; }
};

template <class T>
struct RectT {
    T left{};
    T top{};
    T right{};
    T bottom{};
    T Width() const { return right - left; }
    T Height() const { return bottom - top; }
};

template <class T>
bool operator==(const PointT<T>& a, const PointT<T>& b)
{
    return a.x == b.x && a.y == b.y;
}
template <class T>
bool operator!=(const PointT<T>& a, const PointT<T>& b)
{
    return !(a == b);
}
template <class T>
bool operator==(const RectT<T>& a, const RectT<T>& b)
{
    return a.left == b.left && a.top == b.top && a.right == b.right && a.bottom == b.bottom;
}
template <class T>
bool operator!=(const RectT<T>& a, const RectT<T>& b)
{
    return !(a == b);
}

template <class T>
std::ostream& operator<<(std::ostream& out, const PointT<T>& p)
{
    return out << "(" << p.x << ", " << p.y << ")";
}
template <class T>
std::ostream& operator<<(std::ostream& out, const RectT<T>& r)
{
    return out << "(" << r.left << ", " << r.top << ", " << r.right << ", " << r.bottom << ")";
}

}  // namespace tolmoui
