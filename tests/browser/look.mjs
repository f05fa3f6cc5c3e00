// SPDX-License-Identifier: Apache-2.0
// Screenshots of the course at several widths, for people to look at: node look.mjs BUILD_FOLDER [width…]
import {mkdirSync} from 'node:fs';
import {join} from 'node:path';
import {fileUrl, launch, openPage} from './browser.mjs';
import {Fixtures} from './fixtures.mjs';

const [folder, ...widths] = process.argv.slice(2);
const shots = join(folder, 'screenshots');
mkdirSync(shots, {recursive: true});
const course = new Fixtures(folder).course();
const browser = await launch();
for (const width of widths.length ? widths.map(Number) : [320, 768, 1280, 1920]) {
  const {context, page, complaints} = await openPage(browser, {
    viewport: {width, height: width < 500 ? 640 : width < 1000 ? 1024 : Math.round(width * 0.6)},
    colorScheme: width === 768 ? 'dark' : 'light',
  });
  const shoot = async (name, hash) => {
    await page.goto(fileUrl(course.folder, hash));
    await page.reload();
    await page.waitForTimeout(500);
    await page.screenshot({path: join(shots, `${name}-${width}.png`)});
  };
  await shoot('home', '');
  for (const [i, name] of ['movie', 'lecture', 'audio', 'montage', 'document', 'image', 'web'].entries())
    await shoot(name, `#item=${course.items[i]}`);
  if (complaints.length) console.log(complaints);
  await context.close();
}
await browser.close();
