# Filters for the objects that velathumb-status --json --photos printed for the parts of a tree.

def directories: .[].directories[];
def listed: directories.photo_list[];
def photos: [directories.photos] | add // 0;
def present: [directories.present_thumbs] | add // 0;

# The number of missing or outdated thumbnails per size.
def lacking: reduce (listed | (.missing + .outdated)[]) as $size ({}; .[$size] += 1);

def has_failed: .failed != [];
def is_skipped: .failed == [] and .present == [];

# Paths are arbitrary bytes, which only base64 preserves. base64 -d decodes concatenated base64
# texts.
def path64: .path_base64 // (.path | @base64);
def name64: .name_base64 // (.name | @base64);
def slash64: "Lw==";
def end64: "AA==";

def first_photo(condition):
  first(directories | path64 as $directory | .photo_list[] | select(condition) |
    [$directory, slash64, name64]) | .[];

# The number of thumbnails per size that were missing before and exist now.
def made($before):
  lacking as $lacking |
  $before | lacking | to_entries | map(.value -= ($lacking[.key] // 0)) | map(select(.value > 0));

def summary($before):
  made($before) as $made |
  "Photos:              \(photos)",
  "Thumbnails made now: \([$made[].value] | add // 0) (on disk: \(present))",
  ($made[0] | values | "By size:             " + ($made | map("\(.key) \(.value)") | join(", "))),
  "Photos that failed:  \([listed | select(has_failed)] | length)",
  "Photos skipped:      \([listed | select(is_skipped)] | length)";
