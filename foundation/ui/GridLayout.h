#pragma once
// A grid of layouts, row by row, with its spacing between rows and between
// columns. Cells may stay empty.

#include <vector>

#include "foundation/ui/UI_Layout.h"

namespace tolmoui {

class GridLayout : public Layout {
public:
    GridLayout(int rows, int columns, float rowSpacing, float columnSpacing);

    // Throws std::out_of_range for a cell outside the grid.
    void SetCell(int row, int column, const LayoutPtr& layout);
    const LayoutPtr& GetCell(int row, int column) const;

    int GetRowCount() const { return mRows; }
    int GetColumnCount() const { return mColumns; }
    float GetRowSpacing() const { return mRowSpacing; }
    float GetColumnSpacing() const { return mColumnSpacing; }

private:
    int mRows;
    int mColumns;
    float mRowSpacing;
    float mColumnSpacing;
    std::vector<LayoutPtr> mCells;  // row by row
};

}  // namespace tolmoui
