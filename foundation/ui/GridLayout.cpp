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

}  // namespace tolmoui
