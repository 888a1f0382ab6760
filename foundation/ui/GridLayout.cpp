#include "foundation/ui/GridLayout.h"

#include <algorithm>
#include <stdexcept>

namespace tolmoui {

GridLayout::GridLayout(int rows, int columns, float rowSpacing, float columnSpacing)
    : mRows(std::max(0, rows)),
      mColumns(std::max(0, columns)),
      mRowSpacing(rowSpacing),
      mColumnSpacing(columnSpacing),
      mCells(static_cast<size_t>(mRows * mColumns))
{
}

void GridLayout::SetCell(int row, int column, const LayoutPtr& layout)
{
    if (row < 0 || row >= mRows || column < 0 || column >= mColumns) throw std::out_of_range("no such grid cell");
    mCells[static_cast<size_t>(row * mColumns + column)] = layout;
}

const LayoutPtr& GridLayout::GetCell(int row, int column) const
{
    if (row < 0 || row >= mRows || column < 0 || column >= mColumns) throw std::out_of_range("no such grid cell");
    return mCells[static_cast<size_t>(row * mColumns + column)];
}

float GridLayout::GetColumnWidth(int column) const
{
    float width = 0;
    for (int row = 0; row < mRows; ++row) {
        if (const LayoutPtr& cell = GetCell(row, column)) width = std::max(width, cell->GetSize().x);
    }
    return width;
}

float GridLayout::GetRowHeight(int row) const
{
    float height = 0;
    for (int column = 0; column < mColumns; ++column) {
        if (const LayoutPtr& cell = GetCell(row, column)) height = std::max(height, cell->GetSize().y);
    }
    return height;
}

PointT<float> GridLayout::GetSize() const
{
    PointT<float> size{0, 0};
    for (int column = 0; column < mColumns; ++column) size.x += GetColumnWidth(column);
    for (int row = 0; row < mRows; ++row) size.y += GetRowHeight(row);
    if (mColumns > 1) size.x += mColumnSpacing * static_cast<float>(mColumns - 1);
    if (mRows > 1) size.y += mRowSpacing * static_cast<float>(mRows - 1);
    return size;
}

void GridLayout::Place(const RectT<float>& area)
{
    float top = area.top;
    for (int row = 0; row < mRows; ++row) {
        const float height = GetRowHeight(row);
        float left = area.left;
        for (int column = 0; column < mColumns; ++column) {
            const float width = GetColumnWidth(column);
            if (const LayoutPtr& cell = GetCell(row, column))
                cell->Place(RectT<float>{left, top, left + width, top + height});
            left += width + mColumnSpacing;
        }
        top += height + mRowSpacing;
    }
}

}  // namespace tolmoui
