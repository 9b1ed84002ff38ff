! The part of the Fortran module `tova` that needs no glue: the named
! constants (status codes, file and axis kinds, element types, fixed unit
! keys) and the C functions that take no texts, bound directly under their
! own names. Callers use `tova`, which adds the functions with texts.
! Data buffers are assumed-type (TS 29113, accepted by gfortran and other
! current compilers): a contiguous array of any type and rank goes to the
! library by address, without a copy.
module tova_c
  use, intrinsic :: iso_c_binding
  implicit none

  ! ---- Status codes ---------------------------------------------------------
  integer(c_int32_t), parameter :: F_NO_ERROR = 0, F_EOF = 1, F_ERR_ARGUMENT = 1000, &
    F_ERR_TIMESTEP_RANGE = 1001, F_ERR_ITEM_RANGE = 1002, F_ERR_MEMORY = 2000, F_ERR_READ = 2001, &
    F_ERR_WRITE = 2002, F_ERR_OPEN = 2003, F_ERR_CLOSE = 2004, F_ERR_FLUSH = 2005, F_ERR_SEEK = 2006, &
    F_ERR_ITEMNO = 2007, F_ERR_ELEMENT = 2008, F_ERR_TYPE = 2009, F_ERR_VALUE = 2010, &
    F_ERR_DATE_FORMAT = 2011, F_ERR_TIME_FORMAT = 2012, F_ERR_SIZE = 2013, F_ERR_NOT_RCF = 2014, &
    F_ERR_READONLY = 2015, F_ERR_NOT_BLOCK = 2016, F_ERR_APP_TAG = 2017, F_ERR_DATA_TYPE = 2018, &
    F_ERR_SKIP = 2019, F_ERR_UNIT = 2020

  ! ---- File types, time axes, item axes, statistics --------------------------
  integer(c_int32_t), parameter :: F_EQTIME_FIXEDSPACE_ALLITEMS = 1, F_EQTIME_TVARSPACE_ALLITEMS = 2, &
    F_NEQTIME_FIXEDSPACE_ALLITEMS = 4, F_NEQTIME_FIXEDSPACE_VARITEMS = 8, F_NEQTIME_TVARSPACE_VARITEMS = 16
  integer(c_int32_t), parameter :: F_UNDEFINED_TAXIS = 0, F_TM_EQ_AXIS = 1, F_TM_NEQ_AXIS = 2, &
    F_CAL_EQ_AXIS = 3, F_CAL_NEQ_AXIS = 4
  integer(c_int32_t), parameter :: F_UNDEFINED_AXIS = 0, F_EQ_AXIS_D0 = 1, F_EQ_AXIS_D1 = 2, &
    F_NEQ_AXIS_D1 = 3, F_TVAR_AXIS_D1 = 4, F_EQ_AXIS_D2 = 5, F_NEQ_AXIS_D2 = 6, F_TVAR_AXIS_D2 = 7, &
    F_EQ_AXIS_D3 = 8, F_NEQ_AXIS_D3 = 9, F_TVAR_AXIS_D3 = 10, F_EQ_AXIS_D4 = 11, &
    F_CURVE_LINEAR_AXIS_D2 = 12, F_CURVE_LINEAR_AXIS_D3 = 13
  integer(c_int32_t), parameter :: F_ITEM_STATS_GLOBAL = 1, F_ITEM_STATS_ELEMENT = 2, &
    F_ITEM_STATS_ELEMENT_ALT = 3

  ! ---- Element types and default delete values -------------------------------
  integer(c_int32_t), parameter :: RCF_FLOAT = 1, RCF_DOUBLE = 2, RCF_BYTE = 3, RCF_INT4 = 4, &
    RCF_UINT4 = 5, RCF_INT2 = 6, RCF_UINT2 = 7
  real(c_float), parameter :: F_DELETE_VALUE_FLOAT = -1e-35_c_float
  real(c_double), parameter :: F_DELETE_VALUE_DOUBLE = -1e-255_c_double
  integer(c_int32_t), parameter :: F_DELETE_VALUE_INT = 2147483647

  ! ---- Fixed keys of the unit library ----------------------------------------
  integer(c_int32_t), parameter :: QTY_ITEM_UNDEFINED = 999, QTY_UNIT_UNDEFINED = 0, &
    QTY_UNIT_SECOND = 1400

  ! ---- Functions bound directly (no texts) -----------------------------------
  interface
    integer(c_int32_t) function grdHeaderDestroy(header) bind(C, name="grdHeaderDestroy")
      import; type(c_ptr), intent(inout) :: header
    end function
    type(c_ptr) function grdItemD(header, itemNo) bind(C, name="grdItemD")
      import; type(c_ptr), value :: header; integer(c_int32_t), value :: itemNo
    end function
    integer(c_int32_t) function grdGetNoOfItems(header) bind(C, name="grdGetNoOfItems")
      import; type(c_ptr), value :: header
    end function
    integer(c_int32_t) function grdGetFileType(header) bind(C, name="grdGetFileType")
      import; type(c_ptr), value :: header
    end function
    integer(c_int32_t) function grdGetItemStatsType(header) bind(C, name="grdGetItemStatsType")
      import; type(c_ptr), value :: header
    end function
    integer(c_int32_t) function grdSetDataType(header, dataType) bind(C, name="grdSetDataType")
      import; type(c_ptr), value :: header; integer(c_int32_t), value :: dataType
    end function
    integer(c_int32_t) function grdGetDataType(header) bind(C, name="grdGetDataType")
      import; type(c_ptr), value :: header
    end function
    real(c_float) function grdGetDeleteValFloat(header) bind(C, name="grdGetDeleteValFloat")
      import; type(c_ptr), value :: header
    end function
    real(c_double) function grdGetDeleteValDouble(header) bind(C, name="grdGetDeleteValDouble")
      import; type(c_ptr), value :: header
    end function
    integer(c_int32_t) function grdSetDeleteValFloat(header, value) bind(C, name="grdSetDeleteValFloat")
      import; type(c_ptr), value :: header; real(c_float), value :: value
    end function
    integer(c_int32_t) function grdSetDeleteValDouble(header, value) bind(C, name="grdSetDeleteValDouble")
      import; type(c_ptr), value :: header; real(c_double), value :: value
    end function
    integer(c_int32_t) function grdGetItemElements(item) bind(C, name="grdGetItemElements")
      import; type(c_ptr), value :: item
    end function
    integer(c_int32_t) function grdGetItemDim(item) bind(C, name="grdGetItemDim")
      import; type(c_ptr), value :: item
    end function
    integer(c_int32_t) function grdGetItemAxisType(item) bind(C, name="grdGetItemAxisType")
      import; type(c_ptr), value :: item
    end function

    ! Spatial axes (sizes, origins and steps; coordinates of non-equidistant
    ! axes are the n + 1 cell boundaries, of curvilinear axes the nodes).
    integer(c_int32_t) function grdSetItemAxisEqD0(item, unit) bind(C, name="grdSetItemAxisEqD0")
      import; type(c_ptr), value :: item; integer(c_int32_t), value :: unit
    end function
    integer(c_int32_t) function grdSetItemAxisEqD1(item, unit, xSize, x0, dx) bind(C, name="grdSetItemAxisEqD1")
      import; type(c_ptr), value :: item; integer(c_int32_t), value :: unit, xSize
      real(c_float), value :: x0, dx
    end function
    integer(c_int32_t) function grdSetItemAxisEqD2(item, unit, xSize, ySize, x0, y0, dx, dy) &
        bind(C, name="grdSetItemAxisEqD2")
      import; type(c_ptr), value :: item; integer(c_int32_t), value :: unit, xSize, ySize
      real(c_float), value :: x0, y0, dx, dy
    end function
    integer(c_int32_t) function grdSetItemAxisEqD3(item, unit, xSize, ySize, zSize, x0, y0, z0, dx, dy, dz) &
        bind(C, name="grdSetItemAxisEqD3")
      import; type(c_ptr), value :: item; integer(c_int32_t), value :: unit, xSize, ySize, zSize
      real(c_float), value :: x0, y0, z0, dx, dy, dz
    end function
    integer(c_int32_t) function grdSetItemAxisEqD4(item, unit, xSize, ySize, zSize, tSize, x0, y0, z0, t0, &
        dx, dy, dz, dt) bind(C, name="grdSetItemAxisEqD4")
      import; type(c_ptr), value :: item; integer(c_int32_t), value :: unit, xSize, ySize, zSize, tSize
      real(c_float), value :: x0, y0, z0, t0, dx, dy, dz, dt
    end function
    integer(c_int32_t) function grdGetItemAxisEqD2(item, unit, unitText, xSize, ySize, x0, y0, dx, dy) &
        bind(C, name="grdGetItemAxisEqD2")
      import; type(c_ptr), value :: item
      integer(c_int32_t), optional :: unit, xSize, ySize; type(c_ptr), optional :: unitText
      real(c_float), optional :: x0, y0, dx, dy
    end function
    integer(c_int32_t) function grdGetItemAxisEqD3(item, unit, unitText, xSize, ySize, zSize, x0, y0, z0, &
        dx, dy, dz) bind(C, name="grdGetItemAxisEqD3")
      import; type(c_ptr), value :: item
      integer(c_int32_t), optional :: unit, xSize, ySize, zSize; type(c_ptr), optional :: unitText
      real(c_float), optional :: x0, y0, z0, dx, dy, dz
    end function
    integer(c_int32_t) function grdSetItemAxisNeqD1(item, unit, xSize, xCoords, unused) &
        bind(C, name="grdSetItemAxisNeqD1")
      import; type(c_ptr), value :: item; integer(c_int32_t), value :: unit, xSize, unused
      real(c_double), intent(in) :: xCoords(*)
    end function
    integer(c_int32_t) function grdSetItemAxisNeqD2(item, unit, xSize, ySize, xCoords, yCoords, unused) &
        bind(C, name="grdSetItemAxisNeqD2")
      import; type(c_ptr), value :: item; integer(c_int32_t), value :: unit, xSize, ySize, unused
      real(c_double), intent(in) :: xCoords(*), yCoords(*)
    end function
    integer(c_int32_t) function grdSetItemAxisNeqD3(item, unit, xSize, ySize, zSize, xCoords, yCoords, &
        zCoords, unused) bind(C, name="grdSetItemAxisNeqD3")
      import; type(c_ptr), value :: item; integer(c_int32_t), value :: unit, xSize, ySize, zSize, unused
      real(c_double), intent(in) :: xCoords(*), yCoords(*), zCoords(*)
    end function
    integer(c_int32_t) function grdSetItemAxisCurveLinearD2(item, unit, xSize, ySize, xNodes, yNodes, unused) &
        bind(C, name="grdSetItemAxisCurveLinearD2")
      import; type(c_ptr), value :: item; integer(c_int32_t), value :: unit, xSize, ySize, unused
      real(c_double), intent(in) :: xNodes(*), yNodes(*)
    end function
    integer(c_int32_t) function grdSetItemAxisCurveLinearD3(item, unit, xSize, ySize, zSize, xNodes, yNodes, &
        zNodes, unused) bind(C, name="grdSetItemAxisCurveLinearD3")
      import; type(c_ptr), value :: item; integer(c_int32_t), value :: unit, xSize, ySize, zSize, unused
      real(c_double), intent(in) :: xNodes(*), yNodes(*), zNodes(*)
    end function

    ! Time axes (the calendar setters take texts: below).
    integer(c_int32_t) function grdSetEqTimeAxis(header, unit, startTime, timeStep, firstIndex) &
        bind(C, name="grdSetEqTimeAxis")
      import; type(c_ptr), value :: header; integer(c_int32_t), value :: unit, firstIndex
      real(c_double), value :: startTime, timeStep
    end function
    integer(c_int32_t) function grdSetNeqTimeAxis(header, unit, startTime, firstIndex) &
        bind(C, name="grdSetNeqTimeAxis")
      import; type(c_ptr), value :: header; integer(c_int32_t), value :: unit, firstIndex
      real(c_double), value :: startTime
    end function
    integer(c_int32_t) function grdGetTimeAxisType(header) bind(C, name="grdGetTimeAxisType")
      import; type(c_ptr), value :: header
    end function
    integer(c_int32_t) function grdGetEqTimeAxis(header, unit, unitText, startTime, timeStep, noOfTimeSteps, &
        firstIndex) bind(C, name="grdGetEqTimeAxis")
      import; type(c_ptr), value :: header; integer(c_int32_t), optional :: unit, noOfTimeSteps, firstIndex
      type(c_ptr), optional :: unitText; real(c_double), optional :: startTime, timeStep
    end function
    integer(c_int32_t) function grdGetNeqTimeAxis(header, unit, unitText, startTime, timeStep, noOfTimeSteps, &
        firstIndex) bind(C, name="grdGetNeqTimeAxis")
      import; type(c_ptr), value :: header; integer(c_int32_t), optional :: unit, noOfTimeSteps, firstIndex
      type(c_ptr), optional :: unitText; real(c_double), optional :: startTime, timeStep
    end function

    ! File lifecycle (opening takes the file name: below).
    integer(c_int32_t) function grdFileFlush(header, file) bind(C, name="grdFileFlush")
      import; type(c_ptr), value :: header, file
    end function
    integer(c_int32_t) function grdFileClose(header, file) bind(C, name="grdFileClose")
      import; type(c_ptr), value :: header; type(c_ptr), intent(inout) :: file
    end function

    ! Dynamic data: the header's cursor names the item and the time step.
    integer(c_int32_t) function grdWriteStartBlockDynamic(header, file) bind(C, name="grdWriteStartBlockDynamic")
      import; type(c_ptr), value :: header, file
    end function
    integer(c_int32_t) function grdWriteItemTimeStep(header, file, time, values) &
        bind(C, name="grdWriteItemTimeStep")
      import; type(c_ptr), value :: header, file; real(c_double), value :: time
      type(*), intent(in) :: values(*)
    end function
    integer(c_int32_t) function grdReadItemTimeStep(header, file, time, values) bind(C, name="grdReadItemTimeStep")
      import; type(c_ptr), value :: header, file; real(c_double), intent(out) :: time
      type(*), intent(inout) :: values(*)
    end function
    integer(c_int32_t) function grdSkipItem(header, file) bind(C, name="grdSkipItem")
      import; type(c_ptr), value :: header, file
    end function
    integer(c_int32_t) function grdSkipTimeStep(header, file) bind(C, name="grdSkipTimeStep")
      import; type(c_ptr), value :: header, file
    end function
    integer(c_int32_t) function grdFindTimeStep(header, file, timeStep) bind(C, name="grdFindTimeStep")
      import; type(c_ptr), value :: header, file; integer(c_int32_t), value :: timeStep
    end function
    integer(c_int32_t) function grdFindItemDynamic(header, file, timeStep, itemNo) &
        bind(C, name="grdFindItemDynamic")
      import; type(c_ptr), value :: header, file; integer(c_int32_t), value :: timeStep, itemNo
    end function
    integer(c_int32_t) function grdFindBlockDynamic(header, file) bind(C, name="grdFindBlockDynamic")
      import; type(c_ptr), value :: header, file
    end function
    integer(c_int32_t) function grdFindItemStatic(header, file, staticItemNo) bind(C, name="grdFindItemStatic")
      import; type(c_ptr), value :: header, file; integer(c_int32_t), value :: staticItemNo
    end function

    ! Static items.
    integer(c_int32_t) function grdStaticCreate(item) bind(C, name="grdStaticCreate")
      import; type(c_ptr), intent(out) :: item
    end function
    integer(c_int32_t) function grdStaticDestroy(item) bind(C, name="grdStaticDestroy")
      import; type(c_ptr), intent(inout) :: item
    end function
    integer(c_int32_t) function grdStaticSetHeader(header, item) bind(C, name="grdStaticSetHeader")
      import; type(c_ptr), value :: header, item
    end function
    integer(c_int32_t) function grdStaticWrite(item, file, values) bind(C, name="grdStaticWrite")
      import; type(c_ptr), value :: item, file; type(*), intent(in) :: values(*)
    end function
    type(c_ptr) function grdStaticRead(file, status) bind(C, name="grdStaticRead")
      import; type(c_ptr), value :: file; integer(c_int32_t), intent(out), optional :: status
    end function
    integer(c_int32_t) function grdStaticGetData(item, values) bind(C, name="grdStaticGetData")
      import; type(c_ptr), value :: item; type(*), intent(inout) :: values(*)
    end function
    integer(c_int32_t) function grdStaticSkip(file) bind(C, name="grdStaticSkip")
      import; type(c_ptr), value :: file
    end function

    ! Statistics.
    integer(c_int32_t) function grdGetItemStatsGlobal(item, minimum, maximum, deletes) &
        bind(C, name="grdGetItemStatsGlobal")
      import; type(c_ptr), value :: item; real(c_double), optional :: minimum, maximum
      integer(c_int32_t), optional :: deletes
    end function
    integer(c_int32_t) function grdGetItemStats(header, itemNo, element, minimum, maximum, mean, stdDev, &
        autoCorrelation, values, deletes, pairs) bind(C, name="grdGetItemStats")
      import; type(c_ptr), value :: header; integer(c_int32_t), value :: itemNo, element
      real(c_double), optional :: minimum, maximum, mean, stdDev, autoCorrelation
      integer(c_int32_t), optional :: values, deletes, pairs
    end function

    ! Unit library: conversions.
    integer(c_int) function qtyItemUnitEqv(itemType, unit) bind(C, name="qtyItemUnitEqv")
      import; integer(c_int32_t), value :: itemType, unit
    end function
    integer(c_int) function qtyConvertUnit(fromUnit, value, toUnit, out) bind(C, name="qtyConvertUnit")
      import; integer(c_int32_t), value :: fromUnit, toUnit; real(c_double), value :: value
      real(c_double), intent(out) :: out
    end function
    integer(c_int) function qtyConvertItemArrayF(fromUnit, toUnit, array, count, deleteValue) &
        bind(C, name="qtyConvertItemArrayF")
      import; integer(c_int32_t), value :: fromUnit, toUnit, count; real(c_float), intent(inout) :: array(*)
      real(c_float), value :: deleteValue
    end function
    integer(c_int) function qtyConvertItemArrayD(fromUnit, toUnit, array, count, deleteValue) &
        bind(C, name="qtyConvertItemArrayD")
      import; integer(c_int32_t), value :: fromUnit, toUnit, count; real(c_double), intent(inout) :: array(*)
      real(c_double), value :: deleteValue
    end function

    ! More of the header and items.
    integer(c_int32_t) function grdSetAppVersionNo(header, versionNo) bind(C, name="grdSetAppVersionNo")
      import; type(c_ptr), value :: header; integer(c_int32_t), value :: versionNo
    end function
    integer(c_int32_t) function grdGetAppVersionNo(header) bind(C, name="grdGetAppVersionNo")
      import; type(c_ptr), value :: header
    end function
    integer(c_int32_t) function grdParamModifyTimes(header, flag) bind(C, name="grdParamModifyTimes")
      import; type(c_ptr), value :: header; integer(c_int32_t), value :: flag
    end function
    integer(c_int32_t) function grdSetItemUnitConversion(item, mode, unit) bind(C, name="grdSetItemUnitConversion")
      import; type(c_ptr), value :: item; integer(c_int32_t), value :: mode, unit
    end function
    integer(c_int32_t) function grdGetItemBytes(item) bind(C, name="grdGetItemBytes")
      import; type(c_ptr), value :: item
    end function
    integer(c_int32_t) function grdGetItemAxisEqD1(item, unit, unitText, xSize, x0, dx) &
        bind(C, name="grdGetItemAxisEqD1")
      import; type(c_ptr), value :: item
      integer(c_int32_t), optional :: unit, xSize; type(c_ptr), optional :: unitText
      real(c_float), optional :: x0, dx
    end function
    integer(c_int32_t) function grdGetItemAxisEqD4(item, unit, unitText, xSize, ySize, zSize, tSize, x0, y0, &
        z0, t0, dx, dy, dz, dt) bind(C, name="grdGetItemAxisEqD4")
      import; type(c_ptr), value :: item
      integer(c_int32_t), optional :: unit, xSize, ySize, zSize, tSize; type(c_ptr), optional :: unitText
      real(c_float), optional :: x0, y0, z0, t0, dx, dy, dz, dt
    end function
    ! Coordinate arrays come back lent by the header: c_f_pointer them.
    integer(c_int32_t) function grdGetItemAxisNeqD1(item, unit, unitText, xSize, xCoords) &
        bind(C, name="grdGetItemAxisNeqD1")
      import; type(c_ptr), value :: item; integer(c_int32_t), optional :: unit, xSize
      type(c_ptr), optional :: unitText, xCoords
    end function
    integer(c_int32_t) function grdGetItemAxisNeqD2(item, unit, unitText, xSize, ySize, xCoords, yCoords) &
        bind(C, name="grdGetItemAxisNeqD2")
      import; type(c_ptr), value :: item; integer(c_int32_t), optional :: unit, xSize, ySize
      type(c_ptr), optional :: unitText, xCoords, yCoords
    end function
    integer(c_int32_t) function grdGetItemAxisNeqD3(item, unit, unitText, xSize, ySize, zSize, xCoords, &
        yCoords, zCoords) bind(C, name="grdGetItemAxisNeqD3")
      import; type(c_ptr), value :: item; integer(c_int32_t), optional :: unit, xSize, ySize, zSize
      type(c_ptr), optional :: unitText, xCoords, yCoords, zCoords
    end function
    integer(c_int32_t) function grdGetItemAxisCurveLinearD2(item, unit, unitText, xSize, ySize, xNodes, &
        yNodes) bind(C, name="grdGetItemAxisCurveLinearD2")
      import; type(c_ptr), value :: item; integer(c_int32_t), optional :: unit, xSize, ySize
      type(c_ptr), optional :: unitText, xNodes, yNodes
    end function
    integer(c_int32_t) function grdGetItemAxisCurveLinearD3(item, unit, unitText, xSize, ySize, zSize, &
        xNodes, yNodes, zNodes) bind(C, name="grdGetItemAxisCurveLinearD3")
      import; type(c_ptr), value :: item; integer(c_int32_t), optional :: unit, xSize, ySize, zSize
      type(c_ptr), optional :: unitText, xNodes, yNodes, zNodes
    end function
    integer(c_int32_t) function grdFileFlushTimeStep(header, file) bind(C, name="grdFileFlushTimeStep")
      import; type(c_ptr), value :: header, file
    end function
    integer(c_int32_t) function grdGetItemCursor(header, nextItemNo, timeStepsDone) bind(C, name="grdGetItemCursor")
      import; type(c_ptr), value :: header; integer(c_int32_t), optional :: nextItemNo, timeStepsDone
    end function

    ! Unit library: user units.
    integer(c_int) function qtyConvertToUserUnit(itemType, unit, value, out) bind(C, name="qtyConvertToUserUnit")
      import; integer(c_int32_t), value :: itemType, unit; real(c_double), value :: value
      real(c_double), intent(out) :: out
    end function
    integer(c_int) function qtyConvertFromUserUnit(itemType, unit, value, out) &
        bind(C, name="qtyConvertFromUserUnit")
      import; integer(c_int32_t), value :: itemType, unit; real(c_double), value :: value
      real(c_double), intent(out) :: out
    end function
    integer(c_int) function qtySetUserUnit(itemType, unit) bind(C, name="qtySetUserUnit")
      import; integer(c_int32_t), value :: itemType, unit
    end function
    integer(c_int) function qtyGetUserUnit(itemType, unit) bind(C, name="qtyGetUserUnit")
      import; integer(c_int32_t), value :: itemType; integer(c_int32_t), intent(out) :: unit
    end function
  end interface
end module tova_c
