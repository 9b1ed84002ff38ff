! The Fortran interface of tova: module `tova` (Fortran 2008 with
! iso_c_binding, plus the assumed-type buffers of TS 29113 that gfortran and
! other current compilers accept).
!
! Handles are type(c_ptr). Functions without texts are bound directly to the
! C functions of the same name; those that take texts accept ordinary Fortran
! strings (trailing blanks are dropped, the terminating zero is added here),
! and those that give texts back return allocatable strings. Data buffers are
! passed by address: a contiguous array of any rank goes to the library
! without a copy. Every function returns the status of the C call (F_NO_ERROR
! or a code below); grdGetStatusText gives its text.
module tova
  use, intrinsic :: iso_c_binding
  implicit none
  private :: cstr, fstr, open_file

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
  end interface

contains

  ! A Fortran string as a C string: trailing blanks dropped, zero added.
  pure function cstr(text) result(c)
    character(len=*), intent(in) :: text
    character(kind=c_char, len=:), allocatable :: c
    c = trim(text)//c_null_char
  end function

  ! A C string lent by the library as a Fortran string ("" for null).
  function fstr(p) result(text)
    type(c_ptr), intent(in) :: p
    character(len=:), allocatable :: text
    character(kind=c_char), pointer :: chars(:)
    integer :: i, n
    interface
      integer(c_size_t) function c_strlen(text) bind(C, name="strlen")
        import; type(c_ptr), value :: text
      end function
    end interface
    if (.not. c_associated(p)) then
      text = ""
      return
    end if
    n = int(c_strlen(p))
    call c_f_pointer(p, chars, [n])
    allocate(character(len=n) :: text)
    do i = 1, n
      text(i:i) = chars(i)
    end do
  end function

  !> The fixed text of a status code, e.g. "F_ERR_OPEN: the file could not be opened".
  function grdGetStatusText(status) result(text)
    integer(c_int32_t), intent(in) :: status
    character(len=:), allocatable :: text
    interface
      type(c_ptr) function c_text(status) bind(C, name="grdGetStatusText")
        import; integer(c_int32_t), value :: status
      end function
    end interface
    text = fstr(c_text(status))
  end function

  !> Makes a header of noOfItems items; header is c_null_ptr on failure.
  integer(c_int32_t) function grdHeaderCreate(fileType, fileTitle, appTitle, appVersionNo, noOfItems, &
      statsType, header) result(status)
    integer(c_int32_t), intent(in) :: fileType, appVersionNo, noOfItems, statsType
    character(len=*), intent(in) :: fileTitle, appTitle
    type(c_ptr), intent(out) :: header
    interface
      integer(c_int32_t) function c_create(fileType, fileTitle, appTitle, appVersionNo, noOfItems, statsType, &
          header) bind(C, name="grdHeaderCreate")
        import; integer(c_int32_t), value :: fileType, appVersionNo, noOfItems, statsType
        character(kind=c_char), intent(in) :: fileTitle(*), appTitle(*); type(c_ptr), intent(out) :: header
      end function
    end interface
    status = c_create(fileType, cstr(fileTitle), cstr(appTitle), appVersionNo, noOfItems, statsType, header)
  end function

  function grdGetFileTitle(header) result(text)
    type(c_ptr), intent(in) :: header
    character(len=:), allocatable :: text
    interface
      type(c_ptr) function c_get(header) bind(C, name="grdGetFileTitle")
        import; type(c_ptr), value :: header
      end function
    end interface
    text = fstr(c_get(header))
  end function

  function grdGetAppTitle(header) result(text)
    type(c_ptr), intent(in) :: header
    character(len=:), allocatable :: text
    interface
      type(c_ptr) function c_get(header) bind(C, name="grdGetAppTitle")
        import; type(c_ptr), value :: header
      end function
    end interface
    text = fstr(c_get(header))
  end function

  integer(c_int32_t) function grdSetGeoInfoUTMProj(header, projection, longitude, latitude, orientation) &
      result(status)
    type(c_ptr), intent(in) :: header
    character(len=*), intent(in) :: projection
    real(c_double), intent(in) :: longitude, latitude, orientation
    interface
      integer(c_int32_t) function c_set(header, projection, longitude, latitude, orientation) &
          bind(C, name="grdSetGeoInfoUTMProj")
        import; type(c_ptr), value :: header; character(kind=c_char), intent(in) :: projection(*)
        real(c_double), value :: longitude, latitude, orientation
      end function
    end interface
    status = c_set(header, cstr(projection), longitude, latitude, orientation)
  end function

  !> Name, quantity type, unit and element type of an item (or static item).
  integer(c_int32_t) function grdSetItemInfo(header, item, itemType, name, unit, dataType) result(status)
    type(c_ptr), intent(in) :: header, item
    integer(c_int32_t), intent(in) :: itemType, unit, dataType
    character(len=*), intent(in) :: name
    interface
      integer(c_int32_t) function c_set(header, item, itemType, name, unit, dataType) bind(C, name="grdSetItemInfo")
        import; type(c_ptr), value :: header, item; integer(c_int32_t), value :: itemType, unit, dataType
        character(kind=c_char), intent(in) :: name(*)
      end function
    end interface
    status = c_set(header, item, itemType, cstr(name), unit, dataType)
  end function

  integer(c_int32_t) function grdGetItemInfo(item, itemType, itemTypeText, name, unit, unitText, dataType) &
      result(status)
    type(c_ptr), intent(in) :: item
    integer(c_int32_t), intent(out), optional :: itemType, unit, dataType
    character(len=:), allocatable, intent(out), optional :: itemTypeText, name, unitText
    integer(c_int32_t) :: t, u, d
    type(c_ptr) :: tt, nn, ut
    interface
      integer(c_int32_t) function c_get(item, itemType, itemTypeText, name, unit, unitText, dataType) &
          bind(C, name="grdGetItemInfo")
        import; type(c_ptr), value :: item; integer(c_int32_t) :: itemType, unit, dataType
        type(c_ptr) :: itemTypeText, name, unitText
      end function
    end interface
    t = 0; u = 0; d = 0
    tt = c_null_ptr; nn = c_null_ptr; ut = c_null_ptr
    status = c_get(item, t, tt, nn, u, ut, d)
    if (present(itemType)) itemType = t
    if (present(unit)) unit = u
    if (present(dataType)) dataType = d
    if (present(itemTypeText)) itemTypeText = fstr(tt)
    if (present(name)) name = fstr(nn)
    if (present(unitText)) unitText = fstr(ut)
  end function

  integer(c_int32_t) function grdSetEqCalendarAxis(header, startDate, startTime, unit, startOffset, timeStep, &
      firstIndex) result(status)
    type(c_ptr), intent(in) :: header
    character(len=*), intent(in) :: startDate, startTime
    integer(c_int32_t), intent(in) :: unit, firstIndex
    real(c_double), intent(in) :: startOffset, timeStep
    interface
      integer(c_int32_t) function c_set(header, startDate, startTime, unit, startOffset, timeStep, firstIndex) &
          bind(C, name="grdSetEqCalendarAxis")
        import; type(c_ptr), value :: header; character(kind=c_char), intent(in) :: startDate(*), startTime(*)
        integer(c_int32_t), value :: unit, firstIndex; real(c_double), value :: startOffset, timeStep
      end function
    end interface
    status = c_set(header, cstr(startDate), cstr(startTime), unit, startOffset, timeStep, firstIndex)
  end function

  integer(c_int32_t) function grdSetNeqCalendarAxis(header, startDate, startTime, unit, startOffset, firstIndex) &
      result(status)
    type(c_ptr), intent(in) :: header
    character(len=*), intent(in) :: startDate, startTime
    integer(c_int32_t), intent(in) :: unit, firstIndex
    real(c_double), intent(in) :: startOffset
    interface
      integer(c_int32_t) function c_set(header, startDate, startTime, unit, startOffset, firstIndex) &
          bind(C, name="grdSetNeqCalendarAxis")
        import; type(c_ptr), value :: header; character(kind=c_char), intent(in) :: startDate(*), startTime(*)
        integer(c_int32_t), value :: unit, firstIndex; real(c_double), value :: startOffset
      end function
    end interface
    status = c_set(header, cstr(startDate), cstr(startTime), unit, startOffset, firstIndex)
  end function

  !> A calendar axis of either kind (equidistant or not): start date and time
  !> as texts, the unit, the time step (0 for a non-equidistant axis), the
  !> number of time steps.
  integer(c_int32_t) function grdGetCalendarAxis(header, startDate, startTime, unit, timeStep, noOfTimeSteps) &
      result(status)
    type(c_ptr), intent(in) :: header
    character(len=:), allocatable, intent(out), optional :: startDate, startTime
    integer(c_int32_t), intent(out), optional :: unit, noOfTimeSteps
    real(c_double), intent(out), optional :: timeStep
    type(c_ptr) :: d, t, ut
    integer(c_int32_t) :: u, n, first
    real(c_double) :: offset, step
    abstract interface
      integer(c_int32_t) function c_get(header, unit, unitText, startDate, startTime, startOffset, timeStep, &
          noOfTimeSteps, firstIndex) bind(C)
        import; type(c_ptr), value :: header; integer(c_int32_t) :: unit, noOfTimeSteps, firstIndex
        type(c_ptr) :: unitText, startDate, startTime; real(c_double) :: startOffset, timeStep
      end function
    end interface
    procedure(c_get), bind(C, name="grdGetEqCalendarAxis") :: c_eq
    procedure(c_get), bind(C, name="grdGetNeqCalendarAxis") :: c_neq
    d = c_null_ptr; t = c_null_ptr; ut = c_null_ptr
    u = 0; n = 0; first = 0; offset = 0; step = 0
    if (grdGetTimeAxisType(header) == F_CAL_NEQ_AXIS) then
      status = c_neq(header, u, ut, d, t, offset, step, n, first)
    else
      status = c_eq(header, u, ut, d, t, offset, step, n, first)
    end if
    if (present(startDate)) startDate = fstr(d)
    if (present(startTime)) startTime = fstr(t)
    if (present(unit)) unit = u
    if (present(timeStep)) timeStep = step
    if (present(noOfTimeSteps)) noOfTimeSteps = n
  end function

  ! ---- Opening files by name ---------------------------------------------------
  !> Creates a file and writes the header; file is c_null_ptr on failure.
  integer(c_int32_t) function grdFileCreate(name, header, file) result(status)
    character(len=*), intent(in) :: name
    type(c_ptr), intent(in) :: header
    type(c_ptr), intent(out) :: file
    interface
      integer(c_int32_t) function c_create(name, header, file) bind(C, name="grdFileCreate")
        import; character(kind=c_char), intent(in) :: name(*); type(c_ptr), value :: header
        type(c_ptr), intent(out) :: file
      end function
    end interface
    file = c_null_ptr
    status = c_create(cstr(name), header, file)
  end function

  !> Opens a file for reading: a new header and the file.
  integer(c_int32_t) function grdFileRead(name, header, file) result(status)
    character(len=*), intent(in) :: name
    type(c_ptr), intent(out) :: header, file
    status = open_file(1, name, header, file)
  end function

  !> Opens a file for reading and writing from the cursor.
  integer(c_int32_t) function grdFileEdit(name, header, file) result(status)
    character(len=*), intent(in) :: name
    type(c_ptr), intent(out) :: header, file
    status = open_file(2, name, header, file)
  end function

  !> Opens a file to add time steps after its last complete one.
  integer(c_int32_t) function grdFileAppend(name, header, file) result(status)
    character(len=*), intent(in) :: name
    type(c_ptr), intent(out) :: header, file
    status = open_file(3, name, header, file)
  end function

  integer(c_int32_t) function open_file(how, name, header, file) result(status)
    integer, intent(in) :: how
    character(len=*), intent(in) :: name
    type(c_ptr), intent(out) :: header, file
    abstract interface
      integer(c_int32_t) function c_open(name, header, file) bind(C)
        import; character(kind=c_char), intent(in) :: name(*); type(c_ptr), intent(out) :: header, file
      end function
    end interface
    procedure(c_open), bind(C, name="grdFileRead") :: c_read
    procedure(c_open), bind(C, name="grdFileEdit") :: c_edit
    procedure(c_open), bind(C, name="grdFileAppend") :: c_append
    header = c_null_ptr
    file = c_null_ptr
    select case (how)
    case (1)
      status = c_read(cstr(name), header, file)
    case (2)
      status = c_edit(cstr(name), header, file)
    case default
      status = c_append(cstr(name), header, file)
    end select
  end function

  integer(c_int32_t) function grdFileDelete(name) result(status)
    character(len=*), intent(in) :: name
    interface
      integer(c_int32_t) function c_delete(name) bind(C, name="grdFileDelete")
        import; character(kind=c_char), intent(in) :: name(*)
      end function
    end interface
    status = c_delete(cstr(name))
  end function

  !> After a crash: makes the header count the complete time steps on disk.
  integer(c_int32_t) function grdFileRecover(name, stepsFound, stepsInHeader) result(status)
    character(len=*), intent(in) :: name
    integer(c_int32_t), intent(out), optional :: stepsFound, stepsInHeader
    integer(c_int32_t) :: found, inHeader
    interface
      integer(c_int32_t) function c_recover(name, found, inHeader) bind(C, name="grdFileRecover")
        import; character(kind=c_char), intent(in) :: name(*); integer(c_int32_t) :: found, inHeader
      end function
    end interface
    found = 0; inHeader = 0
    status = c_recover(cstr(name), found, inHeader)
    if (present(stepsFound)) stepsFound = found
    if (present(stepsInHeader)) stepsInHeader = inHeader
  end function

  ! ---- Unit library: keys -------------------------------------------------------
  ! These return a logical: .true. when the key is known.

  !> Quantity type number of a text key such as "WaterLevel".
  logical function qtyGetItemTypeTag(text, itemType)
    character(len=*), intent(in) :: text
    integer(c_int32_t), intent(out) :: itemType
    interface
      integer(c_int) function c_tag(text, itemType) bind(C, name="qtyGetItemTypeTag")
        import; character(kind=c_char), intent(in) :: text(*); integer(c_int32_t) :: itemType
      end function
    end interface
    itemType = QTY_ITEM_UNDEFINED
    qtyGetItemTypeTag = c_tag(cstr(text), itemType) /= 0
  end function

  !> Unit number of a unit text such as "m/s".
  logical function qtyGetUnitTag(text, unit)
    character(len=*), intent(in) :: text
    integer(c_int32_t), intent(out) :: unit
    interface
      integer(c_int) function c_tag(text, unit) bind(C, name="qtyGetUnitTag")
        import; character(kind=c_char), intent(in) :: text(*); integer(c_int32_t) :: unit
      end function
    end interface
    unit = QTY_UNIT_UNDEFINED
    qtyGetUnitTag = c_tag(cstr(text), unit) /= 0
  end function

  !> Text key of a quantity type ("" when unknown).
  function qtyGetItemTypeKey(itemType) result(text)
    integer(c_int32_t), intent(in) :: itemType
    character(len=:), allocatable :: text
    type(c_ptr) :: p
    interface
      integer(c_int) function c_key(itemType, text) bind(C, name="qtyGetItemTypeKey")
        import; integer(c_int32_t), value :: itemType; type(c_ptr) :: text
      end function
    end interface
    p = c_null_ptr
    if (c_key(itemType, p) == 0) p = c_null_ptr
    text = fstr(p)
  end function

  !> Text key of a unit ("" when unknown).
  function qtyGetUnitKey(unit) result(text)
    integer(c_int32_t), intent(in) :: unit
    character(len=:), allocatable :: text
    type(c_ptr) :: p
    interface
      integer(c_int) function c_key(unit, text) bind(C, name="qtyGetUnitKey")
        import; integer(c_int32_t), value :: unit; type(c_ptr) :: text
      end function
    end interface
    p = c_null_ptr
    if (c_key(unit, p) == 0) p = c_null_ptr
    text = fstr(p)
  end function
end module tova
